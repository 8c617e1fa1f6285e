#pragma once

#include "platform/CalendarStore.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingCalendarStore : public CalendarStore {
 public:
  explicit ForwardingCalendarStore(CalendarStore& next) : _next(next) {}

  CalendarDatabasePtr openCalendarDatabase(int options) override {
    return _next.openCalendarDatabase(options);
  }
  std::optional<std::vector<CalendarStoreHandlePtr>> allStores(
      const CalendarDatabasePtr& database) override {
    return _next.allStores(database);
  }
  CalendarStoreHandlePtr localStore(const CalendarDatabasePtr& database) override {
    return _next.localStore(database);
  }
  void setStoreAllowsEvents(const CalendarStoreHandlePtr& store, bool allowed) override {
    _next.setStoreAllowsEvents(store, allowed);
  }
  void setStoreAllowsReminders(const CalendarStoreHandlePtr& store, bool allowed) override {
    _next.setStoreAllowsReminders(store, allowed);
  }
  void ensureWritableCalendarForEntityType(const CalendarDatabasePtr& database,
                                           CalendarEntityType type,
                                           const CalendarStoreHandlePtr& store) override {
    _next.ensureWritableCalendarForEntityType(database, type, store);
  }
  void ensureDefaultCalendarForNewReminders(const CalendarDatabasePtr& database) override {
    _next.ensureDefaultCalendarForNewReminders(database);
  }
  Status saveCalendarDatabase(const CalendarDatabasePtr& database) override {
    return _next.saveCalendarDatabase(database);
  }

 private:
  CalendarStore& _next;
};

}  // namespace platform
