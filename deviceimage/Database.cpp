#include "deviceimage/Database.h"

#include <sqlite3.h>
#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdlib>
#include <map>
#include <span>
#include <utility>

#include "deviceimage/HeldFiles.h"
#include "deviceimage/Schema.h"

namespace deviceimage {
namespace {

constexpr int kBusyMilliseconds = 5'000;
constexpr std::string_view kSaidNo = "said no";

using Connection = std::unique_ptr<sqlite3, int (*)(sqlite3*)>;

void run(sqlite3* connection, const char* sql) {
  const int code = sqlite3_exec(connection, sql, nullptr, nullptr, nullptr);
  if (code != SQLITE_OK) throw DatabaseFailure(code, sqlite3_errmsg(connection));
}

// The tables and indexes of a new database, made in memory.
Connection emptyDatabase() {
  sqlite3* opened = nullptr;
  const int code = sqlite3_open(":memory:", &opened);
  Connection connection(opened, sqlite3_close);
  if (code != SQLITE_OK) throw DatabaseFailure(code, sqlite3_errstr(code));
  run(opened, ("PRAGMA application_id = " + std::to_string(kApplicationId)).c_str());
  run(opened, ("PRAGMA user_version = " + std::to_string(kSchemaVersion)).c_str());
  for (const std::string_view statement : kSchema) run(opened, std::string(statement).c_str());
  return connection;
}

// What a killed program left would be put into a new database, though it belongs to one that has
// gone.
void refuseJournalWithoutDatabase(const DeviceImage& image, std::string_view name) {
  for (const char* const suffix : {"-journal", "-wal"}) {
    const std::string journal = std::string(name) + suffix;
    const FileLook look = image.lookAt(journal);
    const bool isEmpty = look.kind == FileLook::Kind::file && look.size == 0;
    if (look.kind != FileLook::Kind::nothing && !isEmpty)
      throw DatabaseFailure(SQLITE_CANTOPEN,
                            "the database \"" + std::string(name) + "\" is missing, and \"" +
                                journal +
                                "\" is there; put the database back, or move that file away");
  }
}

// Puts an empty database in place in one step, so that an empty file is never one of ours.
void createDatabase(const DeviceImage& image, std::string_view name) {
  const Connection connection = emptyDatabase();
  sqlite3_int64 size = 0;
  const std::unique_ptr<unsigned char, void (*)(void*)> bytes(
      sqlite3_serialize(connection.get(), "main", &size, 0), sqlite3_free);
  if (bytes == nullptr) throw DatabaseFailure(SQLITE_NOMEM, sqlite3_errstr(SQLITE_NOMEM));
  const platform::Status made =
      image.createFile(name, {bytes.get(), static_cast<std::size_t>(size)});
  if (!made.isSuccess() && made.code != EEXIST)  // another program was quicker
    throw DatabaseFailure(SQLITE_CANTOPEN, made.error->description);
}

// Everything that the schema says, whatever of it has a name in common: a trigger may be called
// like its table.
std::vector<std::string> schemaOf(sqlite3* connection) {
  std::vector<std::string> rows;
  const int code = sqlite3_exec(
      connection,
      "SELECT json_array(type, name, tbl_name, sql) FROM sqlite_schema ORDER BY type, name, "
      "tbl_name, sql",
      [](void* into, int, char** values, char**) {
        static_cast<std::vector<std::string>*>(into)->emplace_back(values[0]);
        return 0;
      },
      &rows, nullptr);
  if (code != SQLITE_OK) throw DatabaseFailure(code, sqlite3_errmsg(connection));
  return rows;
}

// Made once a process, because making a database takes longer than opening one.
const std::vector<std::string>& expectedSchema() {
  static const std::vector<std::string> schema = schemaOf(emptyDatabase().get());
  return schema;
}

std::int64_t pragmaOf(sqlite3* connection, const char* pragma) {
  std::int64_t value = 0;
  const int code = sqlite3_exec(
      connection, pragma,
      [](void* into, int, char** values, char**) {
        *static_cast<std::int64_t*>(into) = std::strtoll(values[0], nullptr, 10);
        return 0;
      },
      &value, nullptr);
  if (code != SQLITE_OK) throw DatabaseFailure(code, sqlite3_errmsg(connection));
  return value;
}

}  // namespace

Database::Database(std::string name, Descriptor directory, sqlite3* connection)
    : _name(std::move(name)), _directory(std::move(directory)), _connection(connection) {}

Database::~Database() {
  for (const auto& [sql, statement] : _statements) sqlite3_finalize(statement);
  sqlite3_close_v2(_connection);
}

std::unique_ptr<Database> Database::openExisting(const DeviceImage& image,
                                                 platform::SyncDataType type,
                                                 DatabaseAccess access) {
  const std::string name(DeviceImage::databaseFile(type));
  // Not opened here for a look: closing it would free the locks of our other connections to it.
  const FileLook look = image.lookAt(name);
  if (look.kind == FileLook::Kind::nothing) return nullptr;
  if (look.kind != FileLook::Kind::file || look.size == 0)
    throw DatabaseFailure(SQLITE_NOTADB,
                          "\"" + name + "\" in the image is " +
                              (look.kind == FileLook::Kind::file ? "an empty file" : "no file") +
                              " and no database; put the right file in its place");
  sqlite3* opened = nullptr;
  const int flags =
      access == DatabaseAccess::readOnly ? SQLITE_OPEN_READONLY : SQLITE_OPEN_READWRITE;
  DeviceImage::Parent parent = image.openParent(name);
  if (!parent.status.isSuccess())
    throw DatabaseFailure(SQLITE_CANTOPEN, parent.status.error->description);
  Descriptor directory(parent.descriptor);
  const std::string path = heldPath(directory.number(), parent.name);
  const int code =
      sqlite3_open_v2(path.c_str(), &opened, flags | SQLITE_OPEN_NOFOLLOW, wayToHeldFiles());
  std::unique_ptr<Database> database(new Database(name, std::move(directory), opened));
  if (code != SQLITE_OK) database->_raise(code, "cannot be opened");
  database->_refuseWriteAheadMode();
  database->_configure();
  database->_checkSchema();
  return database;
}

std::unique_ptr<Database> Database::openOrCreate(const DeviceImage& image,
                                                 platform::SyncDataType type) {
  if (image.lookAt(DeviceImage::databaseFile(type)).kind == FileLook::Kind::nothing) {
    refuseJournalWithoutDatabase(image, DeviceImage::databaseFile(type));
    createDatabase(image, DeviceImage::databaseFile(type));
  }
  std::unique_ptr<Database> database = openExisting(image, type, DatabaseAccess::readWrite);
  if (database == nullptr)
    throw DatabaseFailure(SQLITE_CANTOPEN, "\"" + std::string(DeviceImage::databaseFile(type)) +
                                               "\" in the image is gone again");
  return database;
}

// Before anything else is read, because SQLite would make the files of that mode, and wait for what
// lies in their places.
void Database::_refuseWriteAheadMode() const {
  constexpr sqlite3_int64 kVersionsAt = 18;  // for writing and for reading, in the file's header
  constexpr unsigned char kWriteAhead = 2;
  std::array<unsigned char, 2> versions{};
  sqlite3_file* file = nullptr;
  sqlite3_file_control(_connection, "main", SQLITE_FCNTL_FILE_POINTER, static_cast<void*>(&file));
  if (file == nullptr || file->pMethods == nullptr) return;
  file->pMethods->xRead(file, versions.data(), static_cast<int>(versions.size()), kVersionsAt);
  if (versions[0] != kWriteAhead && versions[1] != kWriteAhead) return;
  throw DatabaseFailure(SQLITE_SCHEMA, "the database \"" + _name +
                                           "\" cannot be used: it is in write-ahead mode; run "
                                           "\"PRAGMA journal_mode = DELETE\" on it");
}

void Database::_configure() {
  sqlite3_busy_timeout(_connection, kBusyMilliseconds);
  sqlite3_db_config(_connection, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
  sqlite3_db_config(_connection, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
  sqlite3_db_config(_connection, SQLITE_DBCONFIG_ENABLE_TRIGGER, 0, nullptr);
  sqlite3_db_config(_connection, SQLITE_DBCONFIG_ENABLE_VIEW, 0, nullptr);
  for (const char* pragma : {"PRAGMA foreign_keys = ON", "PRAGMA cell_size_check = ON",
                             "PRAGMA mmap_size = 0", "PRAGMA temp_store = MEMORY",
                             // A commit that has returned survives a power cut.
                             "PRAGMA synchronous = EXTRA"})
    Statement(*this, pragma).run();
}

void Database::_checkSchema() {
  try {
    if (pragmaOf(_connection, "PRAGMA application_id") != kApplicationId)
      throw DatabaseFailure(SQLITE_NOTADB, "it belongs to another program");
    const std::int64_t version = pragmaOf(_connection, "PRAGMA user_version");
    if (version > kSchemaVersion)
      throw DatabaseFailure(SQLITE_SCHEMA, "it is of version " + std::to_string(version) +
                                               ", and this program knows versions up to " +
                                               std::to_string(kSchemaVersion) +
                                               "; use a newer program");
    if (version != kSchemaVersion || schemaOf(_connection) != expectedSchema())
      throw DatabaseFailure(
          SQLITE_SCHEMA, "its tables are not those of version " + std::to_string(kSchemaVersion));
  } catch (const DatabaseFailure& failure) {
    throw DatabaseFailure(failure.code(),
                          "the database \"" + _name + "\" cannot be used: " + failure.what());
  }
}

void Database::_raise(int code, std::string_view what) const {
  std::string text = "the database \"" + _name + "\" " + std::string(what) + ": ";
  text += _connection == nullptr ? sqlite3_errstr(code) : sqlite3_errmsg(_connection);
  if (_connection != nullptr && sqlite3_extended_errcode(_connection) == SQLITE_READONLY_ROLLBACK)
    text += " (a program was stopped while it wrote; open the image for writing once)";
  const int extended = _connection == nullptr ? code : sqlite3_extended_errcode(_connection);
  // Once the database is open, only its journals are opened.
  if (extended == SQLITE_IOERR_ACCESS || (extended == SQLITE_CANTOPEN && what == kSaidNo)) {
    text +=
        " (what lies in the place of its \"-journal\" or \"-wal\" cannot be reached, or is none of "
        "its own; keep it, and put the right file there)";
    code = SQLITE_CANTOPEN;
  }
  throw DatabaseFailure(code, text);
}

std::int64_t Database::changedRows() const { return sqlite3_changes64(_connection); }

std::int64_t Database::lastInsertedRow() const { return sqlite3_last_insert_rowid(_connection); }

Statement::Statement(Database& database, std::string_view sql) : _database(database) {
  // Some pragmas do their work when they are prepared.
  const bool isKept = !sql.starts_with("PRAGMA");
  if (isKept) {
    auto place = database._statements.find(sql);
    if (place == database._statements.end())
      place = database._statements.emplace(sql, nullptr).first;
    _kept = &place->second;
    _statement = std::exchange(*_kept, nullptr);
    if (_statement != nullptr) return;
  }
  _check(sqlite3_prepare_v3(database._connection, sql.data(), static_cast<int>(sql.size()),
                            isKept ? SQLITE_PREPARE_PERSISTENT : 0, &_statement, nullptr));
}

Statement::~Statement() {
  if (_kept == nullptr || *_kept != nullptr) {
    sqlite3_finalize(_statement);
    return;
  }
  sqlite3_reset(_statement);  // ends what it reads, and tells again of a failure that was told
  sqlite3_clear_bindings(_statement);
  *_kept = _statement;
}

void Statement::_check(int code) const {
  if (code != SQLITE_OK) _database._raise(code, kSaidNo);
}

void Statement::_reset() {
  sqlite3_reset(_statement);  // repeats the failure of the last step, which has been raised
  _check(sqlite3_clear_bindings(_statement));
}

bool Statement::step() {
  const int code = sqlite3_step(_statement);
  if (code == SQLITE_ROW) return true;
  if (code != SQLITE_DONE) {
    sqlite3_reset(_statement);
    _check(code);
  }
  sqlite3_reset(_statement);  // ends the read transaction
  return false;
}

std::int64_t Statement::integer(int column) const {
  return sqlite3_column_int64(_statement, column);
}

bool Statement::isNull(int column) const {
  return sqlite3_column_type(_statement, column) == SQLITE_NULL;
}

std::string_view Statement::bytes(int column) const {
  const void* const data = sqlite3_column_blob(_statement, column);
  const auto size = static_cast<std::size_t>(sqlite3_column_bytes(_statement, column));
  return {static_cast<const char*>(data), data == nullptr ? 0 : size};
}

std::optional<std::int64_t> Statement::optionalInteger(int column) const {
  if (isNull(column)) return std::nullopt;
  return integer(column);
}

std::optional<std::string> Statement::optionalText(int column) const {
  if (isNull(column)) return std::nullopt;
  return text(column);
}

void Statement::_bind(int index, std::int64_t value) {
  _check(sqlite3_bind_int64(_statement, index, value));
}

void Statement::_bind(int index, std::string_view value) {
  // An empty view may have no address, which would bind NULL.
  _check(sqlite3_bind_text64(_statement, index, value.empty() ? "" : value.data(), value.size(),
                             SQLITE_TRANSIENT, SQLITE_UTF8));
}

void Statement::_bind(int index, Blob value) {
  _check(sqlite3_bind_blob64(_statement, index, value.bytes.empty() ? "" : value.bytes.data(),
                             value.bytes.size(), SQLITE_TRANSIENT));
}

Transaction::Transaction(Database& database) : _database(database) {
  execute(database, "BEGIN IMMEDIATE");
}

void Transaction::commit() {
  execute(_database, "COMMIT");
  _isOpen = false;
}

Transaction::~Transaction() {
  // Some failures roll back by themselves; then there is nothing left to do.
  if (_isOpen && sqlite3_get_autocommit(_database._connection) == 0)
    sqlite3_exec(_database._connection, "ROLLBACK", nullptr, nullptr, nullptr);
}

DatabaseSet::DatabaseSet(std::shared_ptr<const DeviceImage> image, DatabaseAccess access,
                         std::vector<std::string> leftAlone)
    : _image(std::move(image)), _access(access), _leftAlone(std::move(leftAlone)) {}

void DatabaseSet::_raiseIfLeftAlone(platform::SyncDataType type) const {
  const std::string_view name = DeviceImage::databaseFile(type);
  if (std::find(_leftAlone.begin(), _leftAlone.end(), name) == _leftAlone.end()) return;
  throw DatabaseFailure(SQLITE_CANTOPEN, "the database \"" + std::string(name) +
                                             "\" cannot be used and is left alone");
}

std::unique_ptr<Database>& DatabaseSet::_slot(platform::SyncDataType type) {
  return _databases[static_cast<std::size_t>(type)];
}

Database* DatabaseSet::find(platform::SyncDataType type) {
  _raiseIfLeftAlone(type);
  std::unique_ptr<Database>& slot = _slot(type);
  if (slot == nullptr) slot = Database::openExisting(*_image, type, _access);
  return slot.get();
}

Database& DatabaseSet::make(platform::SyncDataType type) {
  _raiseIfLeftAlone(type);
  std::unique_ptr<Database>& slot = _slot(type);
  if (slot == nullptr) {
    if (_access == DatabaseAccess::readOnly)
      throw DatabaseFailure(SQLITE_READONLY, "the image was opened for reading only");
    slot = Database::openOrCreate(*_image, type);
  }
  return *slot;
}

}  // namespace deviceimage
