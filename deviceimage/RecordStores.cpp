// Looking at stores, collections and records.
#include "deviceimage/RecordStores.h"

#include <sqlite3.h>

#include <algorithm>
#include <unordered_map>

#include "deviceimage/Database.h"
#include "deviceimage/KeyedHash.h"
#include "deviceimage/StoreRows.h"

namespace deviceimage {
namespace {

// Of the paths of a listing's folders, in bytes. Each has a path of its own.
constexpr std::size_t kMostOfPaths = std::size_t{256} << 20U;

std::string storeQuery(Dataclass dataclass, std::string_view condition) {
  const std::string visible = dataclass == Dataclass::reminders ? "reminders_visible" : "visible";
  return "SELECT id, account, retired_at, " + visible +
         ", (SELECT count(*) FROM collections c WHERE c.store = stores.id AND c.kind = ?1), "
         "(SELECT count(*) FROM records r WHERE r.store = stores.id AND r.kind = ?1) "
         "FROM stores WHERE " +
         std::string(condition) +
         " ORDER BY account IS NOT NULL, account, retired_at IS NOT NULL, retired_at, id";
}

Store readStore(const Statement& row, Dataclass dataclass) {
  Store store;
  store.dataclass = dataclass;
  store.row = row.integer(0);
  store.account = row.optionalText(1);
  store.retiredAt = row.optionalInteger(2);
  store.retired = store.retiredAt.has_value();
  store.visible = row.boolean(3);
  store.collections = row.integer(4);
  store.records = row.integer(5);
  return store;
}

Record readRecord(const Statement& row, Dataclass dataclass) {
  Record record;
  record.dataclass = dataclass;
  record.row = row.integer(0);
  record.store = row.integer(1);
  record.collection = row.integer(2);
  record.uid = row.text(3);
  std::string baseUID = row.text(4);
  if (baseUID != record.uid) record.conflictCopyOf = std::move(baseUID);
  record.contentHash = row.text(5);
  record.contentSize = row.integer(6);
  record.modifiedAt = row.integer(7);
  record.sourceAccount = row.optionalText(8);
  record.sourceUID = row.optionalText(9);
  return record;
}

}  // namespace

RecordStores::RecordStores(std::shared_ptr<const DeviceImage> image, Access access)
    : _databases(std::make_unique<DatabaseSet>(
          std::move(image),
          access == Access::readOnly ? DatabaseAccess::readOnly : DatabaseAccess::readWrite)) {}

RecordStores::~RecordStores() = default;

RecordStores::Stores RecordStores::listStores() {
  Stores all;
  for (const Dataclass dataclass : kDataclasses) {
    Stores some = listStores(dataclass);
    if (all.status.isSuccess()) all.status = some.status;
    all.stores.insert(all.stores.end(), some.stores.begin(), some.stores.end());
  }
  return all;
}

RecordStores::Stores RecordStores::listStores(Dataclass dataclass) {
  Stores result;
  result.status = statusOf([&] {
    if (Database* const database = _databases->find(syncTypeOf(dataclass))) {
      Statement query(
          *database, storeQuery(dataclass,
                                "account IS NULL AND retired_at IS NULL OR "
                                "EXISTS (SELECT 1 FROM collections c WHERE c.store = stores.id AND "
                                "c.kind = ?1) OR NOT EXISTS (SELECT 1 FROM collections c WHERE "
                                "c.store = stores.id)"));
      query.bind(recordKind(dataclass));
      while (query.step()) result.stores.push_back(readStore(query, dataclass));
    }
    return platform::Status::success();
  });
  if (!result.status.isSuccess()) result.stores.clear();
  return result;
}

RecordStores::Found RecordStores::findStore(Dataclass dataclass,
                                            const std::optional<std::string>& account) {
  Found found;
  found.status = statusOf([&] {
    if (Database* const database = _databases->find(syncTypeOf(dataclass))) {
      Statement query(*database,
                      storeQuery(dataclass, "ifnull(account, '') = ?2 AND retired_at IS NULL"));
      if (query.bind(recordKind(dataclass), account.value_or("")).step())
        found.store = readStore(query, dataclass);
    }
    return platform::Status::success();
  });
  return found;
}

RecordStores::Collections RecordStores::listCollections(Dataclass dataclass, Row store) {
  Collections result;
  result.status = statusOf([&] {
    Database* const database = _databases->find(syncTypeOf(dataclass));
    if (database == nullptr) return platform::Status::success();
    // Each level of folders after the one above it.
    Statement query(
        *database,
        "WITH RECURSIVE tree (id, level) AS ("
        "  SELECT id, 0 FROM collections WHERE store = ?1 AND kind = ?2 AND parent IS NULL"
        "  UNION SELECT c.id, level + 1 FROM tree JOIN collections c ON c.parent = tree.id"
        "    AND c.store = ?1 AND c.kind = ?2) "
        "SELECT c.id, c.parent, c.name, c.writable, c.is_default, "
        "(SELECT count(*) FROM records r WHERE r.collection = c.id) "
        "FROM tree JOIN collections c ON c.id = tree.id ORDER BY level, c.id");
    query.bind(store, recordKind(dataclass));
    std::unordered_map<Row, std::size_t, KeyedHash> places;
    std::size_t room = kMostOfPaths;
    while (query.step()) {
      Collection collection;
      collection.row = query.integer(0);
      collection.parent = query.optionalInteger(1);
      if (collection.parent) collection.path = result.collections[places[*collection.parent]].path;
      if (collection.path.size() == kDeepestFolder)
        throw DatabaseFailure(SQLITE_CORRUPT, "the folders of the database are nested too deep");
      collection.path.push_back(query.text(2));
      for (const std::string& name : collection.path)
        room -= std::min(room, sizeof(std::string) + name.size());
      if (room == 0)
        throw DatabaseFailure(SQLITE_TOOBIG,
                              "the folders of the database are too many, nested too deep");
      collection.writable = query.boolean(3);
      collection.isDefault = query.boolean(4);
      collection.records = query.integer(5);
      places.emplace(collection.row, result.collections.size());
      result.collections.push_back(std::move(collection));
    }
    return platform::Status::success();
  });
  if (!result.status.isSuccess()) result.collections.clear();
  return result;
}

platform::Status RecordStores::visitRecords(Dataclass dataclass, Row store, bool withContent,
                                            const Visitor& visit) {
  return statusOf([&] {
    Database* const database = _databases->find(syncTypeOf(dataclass));
    if (database == nullptr) return platform::Status::success();
    Statement query(*database, std::string("SELECT id, store, collection, uid, base_uid, "
                                           "content_hash, length(content), modified_at, "
                                           "source_account, source_uid") +
                                   (withContent ? ", content" : "") +
                                   " FROM records WHERE store = ?1 AND kind = ?2 ORDER BY uid");
    query.bind(store, recordKind(dataclass));
    while (query.step())
      if (!visit(readRecord(query, dataclass), withContent ? query.bytes(10) : std::string_view()))
        break;
    return platform::Status::success();
  });
}

RecordStores::Content RecordStores::readContent(Dataclass dataclass, Row record) {
  Content content;
  content.status = statusOf([&] {
    if (Database* const database = _databases->find(syncTypeOf(dataclass))) {
      Statement query(*database, "SELECT content FROM records WHERE id = ?1 AND kind = ?2");
      if (query.bind(record, recordKind(dataclass)).step()) content.bytes = query.text(0);
    }
    return platform::Status::success();
  });
  return content;
}

RecordStores::Anchor RecordStores::syncAnchor(Dataclass dataclass, Row store) {
  Anchor anchor;
  anchor.status = statusOf([&] {
    if (Database* const database = _databases->find(syncTypeOf(dataclass))) {
      Statement query(*database, "SELECT anchor FROM anchors WHERE store = ?1 AND kind = ?2");
      if (query.bind(store, recordKind(dataclass)).step()) anchor.anchor = query.text(0);
    }
    return platform::Status::success();
  });
  return anchor;
}

}  // namespace deviceimage
