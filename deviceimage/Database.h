#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/Descriptor.h"
#include "deviceimage/DeviceImage.h"
#include "platform/Status.h"
#include "platform/SyncDataType.h"

struct sqlite3;
struct sqlite3_stmt;

namespace deviceimage {

// A database said no. Raised and caught inside this folder only: whoever works on databases for the
// outside turns it into a status with `asStatus`.
class DatabaseFailure : public std::runtime_error {
 public:
  DatabaseFailure(int code, const std::string& text) : std::runtime_error(text), _code(code) {}
  // The result code of SQLite, never 0.
  int code() const { return _code; }
  platform::Status asStatus() const { return platform::Status::failure(_code, what()); }

 private:
  int _code;
};

// Runs `work`, which answers a status, and turns a DatabaseFailure into one.
template <typename Work>
platform::Status statusOf(const Work& work) {
  try {
    return work();
  } catch (const DatabaseFailure& failure) {
    return failure.asStatus();
  }
}

enum class DatabaseAccess { readOnly, readWrite };

// One connection to the records of one sync type: an SQLite database with the tables of Schema.h, a
// rollback journal and full synchronisation. No transaction stays open between two operations, so
// that several connections never wait for one another for long. One thread at a time.
class Database {
 public:
  // Opens the type's database. Null when the image has none. Raises when it is damaged, not ours,
  // of another version, or not a private file of the image; such a file is left as it is.
  static std::unique_ptr<Database> openExisting(const DeviceImage& image,
                                                platform::SyncDataType type, DatabaseAccess access);
  // The same for writing, and makes an empty database first when there is none.
  static std::unique_ptr<Database> openOrCreate(const DeviceImage& image,
                                                platform::SyncDataType type);
  ~Database();
  Database(const Database&) = delete;
  Database& operator=(const Database&) = delete;

  // The rows changed by the last statement that changes rows.
  std::int64_t changedRows() const;
  std::int64_t lastInsertedRow() const;

 private:
  friend class Statement;
  friend class Transaction;
  Database(std::string name, Descriptor directory, sqlite3* connection);
  void _refuseWriteAheadMode() const;
  void _configure();
  void _checkSchema();
  [[noreturn]] void _raise(int code, std::string_view what) const;

  std::string _name;  // as it is called inside the image
  // Of the file and its journal, which are reached through it: whatever becomes of the names above,
  // nothing outside the image is read or written.
  Descriptor _directory;
  sqlite3* _connection;
  // One statement of each text, null while it is in use: to prepare one takes longer than to run it
  // on the few rows that most look at.
  std::map<std::string, sqlite3_stmt*, std::less<>> _statements;
};

// One prepared statement, which the database keeps for the next user of the same text. Parameters
// are bound, never pasted into the text.
//
//   Statement query(database, "SELECT uid FROM records WHERE store = ?1");
//   query.bind(store);
//   while (query.step()) use(query.text(0));
class Statement {
 public:
  Statement(Database& database, std::string_view sql);
  ~Statement();
  Statement(const Statement&) = delete;
  Statement& operator=(const Statement&) = delete;

  // Starts afresh with these values for ?1, ?2 and so on. Texts and blobs are copied.
  template <typename... Values>
  Statement& bind(const Values&... values) {
    _reset();
    int index = 0;
    (_bind(++index, values), ...);
    return *this;
  }

  // Goes to the next row; false when there is none left, which also ends the statement.
  bool step();
  // For a statement that answers no rows.
  void run() {
    while (step()) {
    }
  }

  // Columns of the current row, from 0. Views are valid until the next step or bind.
  std::int64_t integer(int column) const;
  bool boolean(int column) const { return integer(column) != 0; }
  bool isNull(int column) const;
  std::string_view bytes(int column) const;
  std::string text(int column) const { return std::string(bytes(column)); }
  std::optional<std::int64_t> optionalInteger(int column) const;
  std::optional<std::string> optionalText(int column) const;

  struct Blob {
    std::string_view bytes;
  };

 private:
  void _reset();
  void _bind(int index, std::int64_t value);
  void _bind(int index, int value) { _bind(index, std::int64_t{value}); }
  void _bind(int index, bool value) { _bind(index, std::int64_t{value ? 1 : 0}); }
  void _bind(int index, std::string_view value);
  void _bind(int index, const std::string& value) { _bind(index, std::string_view(value)); }
  void _bind(int index, const char* value) { _bind(index, std::string_view(value)); }
  void _bind(int index, Blob value);
  template <typename T>
  void _bind(int index, const std::optional<T>& value) {
    if (value) _bind(index, *value);  // what is not bound is NULL
  }
  void _check(int code) const;

  Database& _database;
  sqlite3_stmt** _kept = nullptr;  // where the database keeps it; null when it does not
  sqlite3_stmt* _statement = nullptr;
};

// Runs one statement that answers no rows.
template <typename... Values>
void execute(Database& database, std::string_view sql, const Values&... values) {
  Statement(database, sql).bind(values...).run();
}

// A write transaction: all or nothing. What is not committed is rolled back when it goes.
class Transaction {
 public:
  explicit Transaction(Database& database);
  ~Transaction();
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;
  void commit();

 private:
  Database& _database;
  bool _isOpen = true;
};

// The connections of one user to one image, opened when they are first needed, one for each type.
class DatabaseSet {
 public:
  // Each use of a database in `leftAlone`, by its path in the image, raises.
  DatabaseSet(std::shared_ptr<const DeviceImage> image, DatabaseAccess access,
              std::vector<std::string> leftAlone = {});
  const DeviceImage& image() const { return *_image; }
  // The type's database; null when the image has none (asked anew each time).
  Database* find(platform::SyncDataType type);
  // The type's database, made when missing.
  Database& make(platform::SyncDataType type);

 private:
  std::unique_ptr<Database>& _slot(platform::SyncDataType type);
  void _raiseIfLeftAlone(platform::SyncDataType type) const;
  std::shared_ptr<const DeviceImage> _image;
  DatabaseAccess _access;
  std::vector<std::string> _leftAlone;
  std::unique_ptr<Database> _databases[5];
};

}  // namespace deviceimage
