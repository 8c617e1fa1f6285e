#include "deviceimage/ImageCalendarStore.h"

#include <functional>

#include "deviceimage/Dataclass.h"
#include "deviceimage/StoreRows.h"

namespace deviceimage {
namespace {

using Change = std::function<void(Database& database)>;

// What was asked of an open database and not saved; its store handles put their changes here too.
using Changes = std::vector<Change>;

struct StoreHandle : platform::CalendarStoreHandle {
  Row store = 0;
  std::shared_ptr<Changes> changes;
};

struct OpenDatabase : platform::CalendarDatabase {
  std::vector<std::shared_ptr<StoreHandle>> stores;
  std::shared_ptr<StoreHandle> local;
  std::shared_ptr<Changes> changes = std::make_shared<Changes>();
};

void setVisible(const platform::CalendarStoreHandlePtr& handle, Dataclass dataclass, bool visible) {
  const auto ours = std::dynamic_pointer_cast<StoreHandle>(handle);
  if (ours == nullptr) return;
  ours->changes->push_back([store = ours->store, dataclass, visible](Database& database) {
    setStoreVisible(database, store, dataclass, visible);
  });
}

bool isActive(Database& database, Row store) {
  Statement query(database, "SELECT 1 FROM stores WHERE id = ?1 AND retired_at IS NULL");
  return query.bind(store).step();
}

void makeDefaultForReminders(Database& database) {
  const std::string_view kind = recordKind(Dataclass::reminders);
  Statement query(database,
                  "SELECT 1 FROM collections JOIN stores ON stores.id = collections.store "
                  "WHERE kind = ?1 AND is_default AND retired_at IS NULL");
  if (query.bind(kind).step()) return;
  const std::optional<Row> local = findActiveStore(database, std::nullopt);
  if (!local) return;
  execute(database, "UPDATE collections SET is_default = 1 WHERE id = ?1",
          makeCollection(database, *local, Dataclass::reminders, {}));
}

}  // namespace

platform::CalendarDatabasePtr ImageCalendarStore::openCalendarDatabase(int /*options*/) {
  auto opened = std::make_shared<OpenDatabase>();
  const platform::Status status = statusOf([&] {
    Database* const database = _databases.find(platform::CalendarsSyncType);
    if (database == nullptr) return platform::Status::success();
    for (const ActiveStore& store : activeStores(*database)) {
      opened->stores.push_back(std::make_shared<StoreHandle>());
      opened->stores.back()->store = store.row;
      opened->stores.back()->changes = opened->changes;
      if (store.isLocal) opened->local = opened->stores.back();
    }
    return platform::Status::success();
  });
  return status.isSuccess() ? opened : nullptr;
}

std::optional<std::vector<platform::CalendarStoreHandlePtr>> ImageCalendarStore::allStores(
    const platform::CalendarDatabasePtr& database) {
  const auto opened = std::dynamic_pointer_cast<OpenDatabase>(database);
  if (opened == nullptr) return std::nullopt;
  return std::vector<platform::CalendarStoreHandlePtr>(opened->stores.begin(),
                                                       opened->stores.end());
}

platform::CalendarStoreHandlePtr ImageCalendarStore::localStore(
    const platform::CalendarDatabasePtr& database) {
  const auto opened = std::dynamic_pointer_cast<OpenDatabase>(database);
  return opened == nullptr ? nullptr : opened->local;
}

void ImageCalendarStore::setStoreAllowsEvents(const platform::CalendarStoreHandlePtr& store,
                                              bool allowed) {
  setVisible(store, Dataclass::calendars, allowed);
}

void ImageCalendarStore::setStoreAllowsReminders(const platform::CalendarStoreHandlePtr& store,
                                                 bool allowed) {
  setVisible(store, Dataclass::reminders, allowed);
}

void ImageCalendarStore::ensureWritableCalendarForEntityType(
    const platform::CalendarDatabasePtr& database, platform::CalendarEntityType type,
    const platform::CalendarStoreHandlePtr& store) {
  const auto opened = std::dynamic_pointer_cast<OpenDatabase>(database);
  const auto ours = std::dynamic_pointer_cast<StoreHandle>(store);
  if (opened == nullptr || ours == nullptr) return;
  const Dataclass dataclass =
      type == platform::CalendarEntityType::reminders ? Dataclass::reminders : Dataclass::calendars;
  opened->changes->push_back([row = ours->store, dataclass](Database& changed) {
    if (isActive(changed, row)) makeCollection(changed, row, dataclass, {});
  });
}

void ImageCalendarStore::ensureDefaultCalendarForNewReminders(
    const platform::CalendarDatabasePtr& database) {
  if (const auto opened = std::dynamic_pointer_cast<OpenDatabase>(database))
    opened->changes->emplace_back(makeDefaultForReminders);
}

platform::Status ImageCalendarStore::saveCalendarDatabase(
    const platform::CalendarDatabasePtr& database) {
  return statusOf([&] {
    const auto opened = std::dynamic_pointer_cast<OpenDatabase>(database);
    Database* const changed = _databases.find(platform::CalendarsSyncType);
    if (opened == nullptr || changed == nullptr) return platform::Status::success();
    Transaction transaction(*changed);
    for (const Change& change : *opened->changes) change(*changed);
    transaction.commit();
    opened->changes->clear();
    return platform::Status::success();
  });
}

}  // namespace deviceimage
