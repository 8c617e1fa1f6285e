#include "deviceimage/StoreRows.h"

#include <sqlite3.h>

#include <chrono>
#include <unordered_set>

namespace deviceimage {
namespace {

constexpr std::string_view kFindCollection =
    "SELECT id FROM collections WHERE store = ?1 AND kind = ?2 AND ifnull(parent, 0) = ifnull(?3, "
    "0) "
    "AND name = ?4";
constexpr std::string_view kInsertCollection =
    "INSERT INTO collections (store, kind, parent, name, writable) VALUES (?1, ?2, ?3, ?4, ?5)";

constexpr const char* kTooDeep =
    "the folders of the database are nested too deep, or hold one another";

// What a store's first collection is called.
std::string_view firstCollectionName(Dataclass dataclass) {
  switch (dataclass) {
    case Dataclass::mail:
      return "Mail Accounts";
    case Dataclass::contacts:
      return "Contacts";
    case Dataclass::calendars:
      return "Calendar";
    case Dataclass::reminders:
      return "Reminders";
    case Dataclass::bookmarks:
      return "Bookmarks";
    case Dataclass::notes:
      break;
  }
  return "Notes";
}

Row findOrMakeCollection(Database& database, Row store, Dataclass dataclass,
                         std::optional<Row> parent, std::string_view name) {
  Statement find(database, kFindCollection);
  if (find.bind(store, recordKind(dataclass), parent, name).step()) return find.integer(0);
  execute(database, kInsertCollection, store, recordKind(dataclass), parent, name, true);
  return database.lastInsertedRow();
}

// Makes a writable collection in a store that has none; what has the usual name is read-only.
Row makeFirstCollection(Database& database, Row store, Dataclass dataclass) {
  const std::string usual(firstCollectionName(dataclass));
  const std::optional<Row> noParent;
  std::string name = usual;
  Statement find(database, kFindCollection);
  for (int n = 2; find.bind(store, recordKind(dataclass), noParent, name).step(); ++n)
    name = usual + " " + std::to_string(n);
  execute(database, kInsertCollection, store, recordKind(dataclass), noParent, name, true);
  return database.lastInsertedRow();
}

}  // namespace

std::int64_t secondsNow() {
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  return std::chrono::duration_cast<std::chrono::seconds>(now).count();
}

std::vector<ActiveStore> activeStores(Database& database) {
  Statement query(database,
                  "SELECT id, account IS NULL FROM stores WHERE retired_at IS NULL "
                  "ORDER BY account IS NOT NULL, id");
  std::vector<ActiveStore> stores;
  while (query.step()) stores.push_back({query.integer(0), query.boolean(1)});
  return stores;
}

std::optional<Row> findActiveStore(Database& database, const std::optional<std::string>& account) {
  Statement query(database,
                  "SELECT id FROM stores WHERE ifnull(account, '') = ?1 AND retired_at IS NULL");
  if (!query.bind(account.value_or("")).step()) return std::nullopt;
  return query.integer(0);
}

Row makeActiveStore(Database& database, const std::optional<std::string>& account) {
  if (const std::optional<Row> store = findActiveStore(database, account)) return *store;
  execute(database, "INSERT INTO stores (account) VALUES (?1)", account);
  return database.lastInsertedRow();
}

void retireStore(Database& database, Row store) {
  execute(database, "UPDATE stores SET retired_at = ?2 WHERE id = ?1 AND retired_at IS NULL", store,
          secondsNow());
}

void retireRecords(Database& database, Row store, std::span<const Dataclass> dataclasses) {
  std::int64_t count = 0;
  for (const Dataclass dataclass : dataclasses) count += countRecords(database, store, dataclass);
  if (count == 0) return;
  execute(database,
          "INSERT INTO stores (account, retired_at, visible, reminders_visible) "
          "SELECT account, ?2, visible, reminders_visible FROM stores WHERE id = ?1",
          store, secondsNow());
  const Row retired = database.lastInsertedRow();
  CollectionMap collections(database, retired);
  Statement move(database, "UPDATE records SET store = ?2, collection = ?3 WHERE collection = ?1");
  for (const Dataclass dataclass : dataclasses) {
    std::vector<Row> filled;
    Statement query(database,
                    "SELECT id FROM collections WHERE store = ?1 AND kind = ?2 AND EXISTS "
                    "(SELECT 1 FROM records WHERE collection = collections.id)");
    query.bind(store, recordKind(dataclass));
    while (query.step()) filled.push_back(query.integer(0));
    for (const Row collection : filled)
      move.bind(collection, retired, collections.targetOf(collection)).run();
  }
}

void setStoreVisible(Database& database, Row store, Dataclass dataclass, bool visible) {
  execute(database,
          dataclass == Dataclass::reminders
              ? "UPDATE stores SET reminders_visible = ?2 WHERE id = ?1 AND reminders_visible <> ?2"
              : "UPDATE stores SET visible = ?2 WHERE id = ?1 AND visible <> ?2",
          store, visible);
}

std::int64_t countRecords(Database& database, Row store, Dataclass dataclass) {
  Statement query(database, "SELECT count(*) FROM records WHERE store = ?1 AND kind = ?2");
  query.bind(store, recordKind(dataclass)).step();
  return query.integer(0);
}

std::vector<Row> recordRows(Database& database, Row store, Dataclass dataclass) {
  Statement query(database, "SELECT id FROM records WHERE store = ?1 AND kind = ?2 ORDER BY id");
  query.bind(store, recordKind(dataclass));
  std::vector<Row> rows;
  while (query.step()) rows.push_back(query.integer(0));
  return rows;
}

Row makeCollection(Database& database, Row store, Dataclass dataclass,
                   std::span<const std::string> path) {
  if (path.empty()) {
    if (const std::optional<Row> writable = findWritableCollection(database, store, dataclass))
      return *writable;
    return makeFirstCollection(database, store, dataclass);
  }
  if (path.size() > kDeepestFolder)
    throw DatabaseFailure(SQLITE_TOOBIG, "folders are nested deeper than " +
                                             std::to_string(kDeepestFolder) + " levels");
  std::optional<Row> collection;
  for (const std::string& name : path)
    collection = findOrMakeCollection(database, store, dataclass, collection, name);
  return *collection;
}

std::optional<Row> findWritableCollection(Database& database, Row store, Dataclass dataclass) {
  Statement query(database,
                  "SELECT id FROM collections WHERE store = ?1 AND kind = ?2 AND parent IS NULL "
                  "AND writable ORDER BY is_default DESC, id LIMIT 1");
  if (!query.bind(store, recordKind(dataclass)).step()) return std::nullopt;
  return query.integer(0);
}

CollectionMap::CollectionMap(Database& database, Row targetStore)
    : _database(database),
      _targetStore(targetStore),
      _readSource(database, "SELECT parent, kind, name, writable FROM collections WHERE id = ?1"),
      _find(database, kFindCollection),
      _insert(database, kInsertCollection) {}

Row CollectionMap::targetOf(Row collection) {
  // Up to the first folder that is known or has no parent, then down again.
  std::vector<std::pair<Row, Source>> unknown;
  std::unordered_set<Row> seen;
  std::optional<Row> next = collection;
  std::optional<Row> target;
  std::size_t depth = 0;
  while (next) {
    if (const auto known = _known.find(*next); known != _known.end()) {
      target = known->second.row;
      depth = known->second.depth;
      break;
    }
    if (unknown.size() == kDeepestFolder || !seen.insert(*next).second ||
        !_readSource.bind(*next).step())
      throw DatabaseFailure(SQLITE_CORRUPT, kTooDeep);
    Source source{_readSource.optionalInteger(0), _readSource.text(1), _readSource.text(2),
                  _readSource.boolean(3)};
    const Row row = *next;
    next = source.parent;
    unknown.emplace_back(row, std::move(source));
  }
  if (depth + unknown.size() > kDeepestFolder) throw DatabaseFailure(SQLITE_CORRUPT, kTooDeep);
  for (auto it = unknown.rbegin(); it != unknown.rend(); ++it) {
    target = _findOrMake(it->second, target);
    _known.emplace(it->first, Target{*target, ++depth});
  }
  return *target;
}

Row CollectionMap::_findOrMake(const Source& source, std::optional<Row> parent) {
  if (_find.bind(_targetStore, source.kind, parent, source.name).step()) return _find.integer(0);
  _insert.bind(_targetStore, source.kind, parent, source.name, source.writable).run();
  return _database.lastInsertedRow();
}

}  // namespace deviceimage
