// Putting records into stores, and the fate of retired stores.
#include <sqlite3.h>

#include "deviceimage/Database.h"
#include "deviceimage/RecordPlacer.h"
#include "deviceimage/RecordStores.h"
#include "deviceimage/StoreRows.h"

namespace deviceimage {
namespace {

// Raises unless there is such a store and it is retired.
void requireRetired(Database& database, Row store) {
  Statement query(database, "SELECT 1 FROM stores WHERE id = ?1 AND retired_at IS NOT NULL");
  if (!query.bind(store).step())
    throw DatabaseFailure(SQLITE_NOTFOUND,
                          "no retired store has the number " + std::to_string(store));
}

// The type's database; raises when there is none.
Database& requireDatabase(DatabaseSet& databases, Dataclass dataclass) {
  Database* const database = databases.find(syncTypeOf(dataclass));
  if (database == nullptr)
    throw DatabaseFailure(
        SQLITE_NOTFOUND, "the image has no " + std::string(dataclassName(dataclass)) + " database");
  return *database;
}

}  // namespace

RecordStores::Added RecordStores::_addTo(Dataclass dataclass,
                                         const std::optional<std::string>& account,
                                         const std::function<void(RecordPlacer& placer)>& add) {
  Added added;
  added.status = statusOf([&] {
    Database& database = _databases->make(syncTypeOf(dataclass));
    Transaction transaction(database);
    RecordPlacer placer(database, makeActiveStore(database, account));
    add(placer);
    transaction.commit();
    added.placed = placer.placed();
    return platform::Status::success();
  });
  return added;
}

RecordStores::Added RecordStores::addRecords(Dataclass dataclass,
                                             const std::optional<std::string>& account,
                                             std::span<const NewRecord> records) {
  return _addTo(dataclass, account, [&](RecordPlacer& placer) {
    for (const NewRecord& record : records) placer.addRecord(dataclass, record);
  });
}

platform::Status RecordStores::ensureStore(Dataclass dataclass,
                                           const std::optional<std::string>& account) {
  return addRecords(dataclass, account, {}).status;
}

platform::Status RecordStores::retireStore(Dataclass dataclass, Row store) {
  return statusOf([&] {
    deviceimage::retireStore(requireDatabase(*_databases, dataclass), store);
    return platform::Status::success();
  });
}

RecordStores::Added RecordStores::bringBackRetiredStore(Dataclass dataclass, Row retiredStore,
                                                        const std::optional<std::string>& account) {
  const platform::Status isRetired = statusOf([&] {
    requireRetired(requireDatabase(*_databases, dataclass), retiredStore);
    return platform::Status::success();
  });
  if (!isRetired.isSuccess()) return {isRetired, {}};
  return _addTo(dataclass, account, [&](RecordPlacer& placer) {
    placer.copyRecords(
        recordRows(_databases->make(syncTypeOf(dataclass)), retiredStore, dataclass));
  });
}

RecordStores::Purged RecordStores::purgeRetiredStore(Dataclass dataclass, Row retiredStore) {
  Purged purged;
  purged.status = statusOf([&] {
    Database& database = requireDatabase(*_databases, dataclass);
    // What is destroyed leaves no readable trace in the file.
    execute(database, "PRAGMA secure_delete = ON");
    Transaction transaction(database);
    requireRetired(database, retiredStore);
    execute(database, "PRAGMA defer_foreign_keys = ON");  // folders go in any order
    execute(database, "DELETE FROM records WHERE store = ?1", retiredStore);
    purged.records = database.changedRows();
    for (const char* sql :
         {"DELETE FROM collections WHERE store = ?1", "DELETE FROM anchors WHERE store = ?1",
          "DELETE FROM stores WHERE id = ?1"})
      execute(database, sql, retiredStore);
    transaction.commit();
    return platform::Status::success();
  });
  if (!purged.status.isSuccess()) purged.records = 0;
  return purged;
}

platform::Status RecordStores::setVisible(Dataclass dataclass, Row store, bool visible) {
  return statusOf([&] {
    setStoreVisible(requireDatabase(*_databases, dataclass), store, dataclass, visible);
    return platform::Status::success();
  });
}

platform::Status RecordStores::setSyncAnchor(Dataclass dataclass, Row store,
                                             std::string_view anchor) {
  return statusOf([&] {
    execute(requireDatabase(*_databases, dataclass),
            "INSERT INTO anchors (store, kind, anchor) VALUES (?1, ?2, ?3) "
            "ON CONFLICT (store, kind) DO UPDATE SET anchor = excluded.anchor",
            store, recordKind(dataclass), anchor);
    return platform::Status::success();
  });
}

}  // namespace deviceimage
