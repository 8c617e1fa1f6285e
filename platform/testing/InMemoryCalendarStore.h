#pragma once

#include <set>
#include <string>

#include "platform/CalendarStore.h"
#include "platform/testing/FakeService.h"

namespace platform {

// A calendar database whose stores a test lists. An open database has changes of its own, which
// saveCalendarDatabase writes back to `contents`; what is not saved is dropped with it.
class InMemoryCalendarStore : public CalendarStore, public FakeService {
 public:
  struct Store {
    std::string name;
    bool isLocal = false;
    bool allowsEvents = true;
    bool allowsReminders = true;
    std::set<CalendarEntityType> writableCalendars = {};  // types with a calendar to write to
  };
  struct Contents {
    std::vector<Store> stores = {{"local", true}};
    bool hasDefaultCalendarForNewReminders = false;
  };
  Contents contents;

  // The saved store of that name, or null.
  const Store* storeNamed(std::string_view name) const;

  CalendarDatabasePtr openCalendarDatabase(int options) override;
  std::optional<std::vector<CalendarStoreHandlePtr>> allStores(
      const CalendarDatabasePtr& database) override;
  CalendarStoreHandlePtr localStore(const CalendarDatabasePtr& database) override;
  void setStoreAllowsEvents(const CalendarStoreHandlePtr& store, bool allowed) override;
  void setStoreAllowsReminders(const CalendarStoreHandlePtr& store, bool allowed) override;
  void ensureWritableCalendarForEntityType(const CalendarDatabasePtr& database,
                                           CalendarEntityType type,
                                           const CalendarStoreHandlePtr& store) override;
  void ensureDefaultCalendarForNewReminders(const CalendarDatabasePtr& database) override;
  Status saveCalendarDatabase(const CalendarDatabasePtr& database) override;

 private:
  struct Database;
  struct DatabaseStore;
};

}  // namespace platform
