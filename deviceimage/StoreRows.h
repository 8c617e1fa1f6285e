#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "deviceimage/Database.h"
#include "deviceimage/Dataclass.h"
#include "deviceimage/KeyedHash.h"
#include "deviceimage/RecordStores.h"

// The rows of stores and collections in one database. Whatever changes something here runs inside
// the caller's transaction; every operation may raise DatabaseFailure.
namespace deviceimage {

// Folders in folders. Deeper ones, or folders that hold themselves, only a damaged database has.
inline constexpr std::size_t kDeepestFolder = 1000;

// Seconds since 1970 UTC.
std::int64_t secondsNow();

struct ActiveStore {
  Row row = 0;
  bool isLocal = false;
};
// The stores in service, the device-local one first.
std::vector<ActiveStore> activeStores(Database& database);

// The active store of the account; without one, the device-local store.
std::optional<Row> findActiveStore(Database& database, const std::optional<std::string>& account);
// The same, made when missing.
Row makeActiveStore(Database& database, const std::optional<std::string>& account);
// Takes the store with all it holds out of service. Its records stay where they are.
void retireStore(Database& database, Row store);
// Takes the store's records of these dataclasses out of service, into a new retired store of the
// same account; the store keeps its collections. Nothing is made when there are none.
void retireRecords(Database& database, Row store, std::span<const Dataclass> dataclasses);

// Shows or hides the store's records of the dataclass; writes nothing when they are so already.
void setStoreVisible(Database& database, Row store, Dataclass dataclass, bool visible);

std::int64_t countRecords(Database& database, Row store, Dataclass dataclass);
// The rows of the store's records of the dataclass, in ascending order.
std::vector<Row> recordRows(Database& database, Row store, Dataclass dataclass);

// The collection with this path of names below the store; missing ones are made. An empty path is
// the collection where new records go.
Row makeCollection(Database& database, Row store, Dataclass dataclass,
                   std::span<const std::string> path);
// A collection of the dataclass that the user can write to, the default one first; empty when there
// is none.
std::optional<Row> findWritableCollection(Database& database, Row store, Dataclass dataclass);

// Finds for collections of other stores those of the same path of names in one store, and makes
// what is missing.
class CollectionMap {
 public:
  CollectionMap(Database& database, Row targetStore);
  // The collection of the target store for `collection`, which may be of any store.
  Row targetOf(Row collection);

 private:
  struct Source {
    std::optional<Row> parent;
    std::string kind;
    std::string name;
    bool writable = true;
  };
  struct Target {
    Row row = 0;
    std::size_t depth = 0;  // 1 for a folder without a parent
  };
  Row _findOrMake(const Source& source, std::optional<Row> parent);
  Database& _database;
  Row _targetStore;
  Statement _readSource;
  Statement _find;
  Statement _insert;
  std::unordered_map<Row, Target, KeyedHash> _known;
};

}  // namespace deviceimage
