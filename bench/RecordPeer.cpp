#include <sqlite3.h>

#include <memory>
#include <stdexcept>
#include <vector>

#include "bench/Records.h"

namespace bench {
namespace {

using Connection = std::unique_ptr<sqlite3, int (*)(sqlite3*)>;

void check(sqlite3* connection, int code) {
  if (code != SQLITE_OK && code != SQLITE_ROW && code != SQLITE_DONE)
    throw std::runtime_error(sqlite3_errmsg(connection));
}

void run(sqlite3* connection, const char* sql) {
  check(connection, sqlite3_exec(connection, sql, nullptr, nullptr, nullptr));
}

// One prepared statement. Texts are bound without a copy.
class Query {
 public:
  Query(sqlite3* connection, const char* sql) : _connection(connection) {
    check(connection, sqlite3_prepare_v2(connection, sql, -1, &_statement, nullptr));
  }
  ~Query() { sqlite3_finalize(_statement); }
  Query(const Query&) = delete;
  Query& operator=(const Query&) = delete;

  Query& put(int index, sqlite3_int64 value) {
    check(_connection, sqlite3_bind_int64(_statement, index, value));
    return *this;
  }
  Query& put(int index, const std::string& text) {
    check(_connection, sqlite3_bind_text(_statement, index, text.data(),
                                         static_cast<int>(text.size()), SQLITE_STATIC));
    return *this;
  }
  bool step() {
    const int code = sqlite3_step(_statement);
    check(_connection, code);
    return code == SQLITE_ROW;
  }
  void reset() { sqlite3_reset(_statement); }
  bool isThere() {
    const bool found = step();
    reset();
    return found;
  }
  void execute() {
    step();
    reset();
  }
  sqlite3_int64 integer(int column) { return sqlite3_column_int64(_statement, column); }
  std::string text(int column) {
    const auto* const bytes =
        reinterpret_cast<const char*>(sqlite3_column_text(_statement, column));
    return {bytes, static_cast<std::size_t>(sqlite3_column_bytes(_statement, column))};
  }

 private:
  sqlite3* _connection;
  sqlite3_stmt* _statement = nullptr;
};

sqlite3_int64 localStore(sqlite3* connection) {
  Query find(connection, "SELECT id FROM stores WHERE account IS NULL AND retired_at IS NULL");
  if (find.step()) return find.integer(0);
  run(connection, "INSERT INTO stores (account) VALUES (NULL)");
  return sqlite3_last_insert_rowid(connection);
}

sqlite3_int64 onlyCollection(sqlite3* connection, sqlite3_int64 store, const std::string& kind) {
  Query insert(connection,
               "INSERT INTO collections (store, kind, name) VALUES (?1, ?2, 'Imported')");
  insert.put(1, store).put(2, kind).execute();
  return sqlite3_last_insert_rowid(connection);
}

int copyRecords(sqlite3* connection, const std::string& account, const std::string& kind,
                const std::vector<sqlite3_int64>& rows) {
  const sqlite3_int64 store = localStore(connection);
  const sqlite3_int64 collection = onlyCollection(connection, store, kind);
  Query read(connection,
             "SELECT kind, uid, base_uid, content_hash, modified_at, collection FROM records "
             "WHERE id = ?1");
  Query findEqual(connection,
                  "SELECT 1 FROM records t JOIN records r ON r.id = ?5 WHERE t.store = ?1 AND "
                  "t.kind = ?2 AND t.base_uid = ?3 AND t.content_hash = ?4 AND "
                  "t.content = r.content");
  Query dropSource(connection,
                   "UPDATE records SET source_account = NULL, source_uid = NULL WHERE store = ?1 "
                   "AND kind = ?2 AND source_account = ?3 AND source_uid = ?4");
  Query findUID(connection,
                "SELECT id, base_uid, content_hash, modified_at FROM records WHERE store = ?1 AND "
                "kind = ?2 AND uid = ?3");
  Query copy(connection,
             "INSERT INTO records (store, kind, collection, uid, base_uid, content, content_hash, "
             "modified_at, source_account, source_uid) SELECT ?2, kind, ?3, ?4, base_uid, content, "
             "content_hash, modified_at, ?5, uid FROM records WHERE id = ?1");
  int copied = 0;
  for (const sqlite3_int64 row : rows) {
    if (!read.put(1, row).step()) throw std::runtime_error("a record is gone");
    const std::string uid = read.text(1);
    const std::string baseUID = read.text(2);
    const std::string hash = read.text(3);
    read.reset();
    if (findEqual.put(1, store).put(2, kind).put(3, baseUID).put(4, hash).put(5, row).isThere())
      continue;
    dropSource.put(1, store).put(2, kind).put(3, account).put(4, uid).execute();
    if (findUID.put(1, store).put(2, kind).put(3, uid).isThere()) continue;
    copy.put(1, row).put(2, store).put(3, collection).put(4, uid).put(5, account).execute();
    ++copied;
  }
  return copied;
}

}  // namespace

int moveWithTheLibrary(const std::string& path, const std::string& account,
                       const std::string& kind) {
  sqlite3* opened = nullptr;
  const int code = sqlite3_open(path.c_str(), &opened);
  const Connection connection(opened, sqlite3_close);  // a failed one has to be closed too
  check(opened, code);
  for (const char* pragma : {"PRAGMA foreign_keys = ON", "PRAGMA cell_size_check = ON",
                             "PRAGMA temp_store = MEMORY", "PRAGMA synchronous = EXTRA"})
    run(opened, pragma);
  std::vector<sqlite3_int64> rows;
  {
    Query list(opened,
               "SELECT r.id FROM records r JOIN stores s ON s.id = r.store WHERE s.account = ?1 "
               "AND s.retired_at IS NULL AND r.kind = ?2 ORDER BY r.id");
    list.put(1, account).put(2, kind);
    while (list.step()) rows.push_back(list.integer(0));
  }
  run(opened, "BEGIN IMMEDIATE");
  const int copied = copyRecords(opened, account, kind, rows);
  run(opened, "COMMIT");
  run(opened, "BEGIN IMMEDIATE");
  Query(opened,
        "UPDATE stores SET retired_at = strftime('%s', 'now') WHERE account = ?1 AND retired_at IS "
        "NULL")
      .put(1, account)
      .execute();
  run(opened, "COMMIT");
  return copied;
}

}  // namespace bench
