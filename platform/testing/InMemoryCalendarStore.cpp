#include "platform/testing/InMemoryCalendarStore.h"

#include <utility>

namespace platform {

struct InMemoryCalendarStore::Database : CalendarDatabase {
  explicit Database(Contents stored) : contents(std::move(stored)) {}
  Contents contents;
};

struct InMemoryCalendarStore::DatabaseStore : CalendarStoreHandle {
  DatabaseStore(std::shared_ptr<Database> owner, std::size_t place)
      : database(std::move(owner)), index(place) {}
  Store& store() const { return database->contents.stores[index]; }
  std::shared_ptr<Database> database;
  std::size_t index;
};

const InMemoryCalendarStore::Store* InMemoryCalendarStore::storeNamed(std::string_view name) const {
  for (const Store& store : contents.stores)
    if (store.name == name) return &store;
  return nullptr;
}

CalendarDatabasePtr InMemoryCalendarStore::openCalendarDatabase(int options) {
  if (_fails("openCalendarDatabase", {std::to_string(options)})) return nullptr;
  return std::make_shared<Database>(contents);
}

std::optional<std::vector<CalendarStoreHandlePtr>> InMemoryCalendarStore::allStores(
    const CalendarDatabasePtr& database) {
  if (_fails("allStores", {})) return std::nullopt;
  const auto open = std::dynamic_pointer_cast<Database>(database);
  std::vector<CalendarStoreHandlePtr> all;
  for (std::size_t i = 0; i < open->contents.stores.size(); ++i)
    all.push_back(std::make_shared<DatabaseStore>(open, i));
  return all;
}

CalendarStoreHandlePtr InMemoryCalendarStore::localStore(const CalendarDatabasePtr& database) {
  if (_fails("localStore", {})) return nullptr;
  const auto open = std::dynamic_pointer_cast<Database>(database);
  for (std::size_t i = 0; i < open->contents.stores.size(); ++i)
    if (open->contents.stores[i].isLocal) return std::make_shared<DatabaseStore>(open, i);
  return nullptr;
}

void InMemoryCalendarStore::setStoreAllowsEvents(const CalendarStoreHandlePtr& store,
                                                 bool allowed) {
  Store& changed = dynamic_cast<DatabaseStore&>(*store).store();
  if (_fails("setStoreAllowsEvents", {changed.name, allowed ? "true" : "false"})) return;
  changed.allowsEvents = allowed;
}

void InMemoryCalendarStore::setStoreAllowsReminders(const CalendarStoreHandlePtr& store,
                                                    bool allowed) {
  Store& changed = dynamic_cast<DatabaseStore&>(*store).store();
  if (_fails("setStoreAllowsReminders", {changed.name, allowed ? "true" : "false"})) return;
  changed.allowsReminders = allowed;
}

void InMemoryCalendarStore::ensureWritableCalendarForEntityType(
    const CalendarDatabasePtr&, CalendarEntityType type, const CalendarStoreHandlePtr& store) {
  Store& changed = dynamic_cast<DatabaseStore&>(*store).store();
  const std::string_view typeName = type == CalendarEntityType::events ? "events" : "reminders";
  if (_fails("ensureWritableCalendarForEntityType", {typeName, changed.name})) return;
  changed.writableCalendars.insert(type);
}

void InMemoryCalendarStore::ensureDefaultCalendarForNewReminders(
    const CalendarDatabasePtr& database) {
  if (_fails("ensureDefaultCalendarForNewReminders", {})) return;
  dynamic_cast<Database&>(*database).contents.hasDefaultCalendarForNewReminders = true;
}

Status InMemoryCalendarStore::saveCalendarDatabase(const CalendarDatabasePtr& database) {
  return _answered("saveCalendarDatabase", {}, [&] {
    contents = dynamic_cast<Database&>(*database).contents;
    return Status::success();
  });
}

}  // namespace platform
