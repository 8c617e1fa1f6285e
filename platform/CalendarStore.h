#pragma once

#include <memory>
#include <optional>
#include <vector>

#include "platform/Export.h"
#include "platform/Status.h"

namespace platform {

// The open calendar database, and one of its stores. The platform's own objects.
class PLATFORM_EXPORT CalendarDatabase {
 public:
  virtual ~CalendarDatabase();
};
using CalendarDatabasePtr = std::shared_ptr<CalendarDatabase>;
class PLATFORM_EXPORT CalendarStoreHandle {
 public:
  virtual ~CalendarStoreHandle();
};
using CalendarStoreHandlePtr = std::shared_ptr<CalendarStoreHandle>;

// What a calendar holds; the values are the platform's.
enum class CalendarEntityType { events = 2, reminders = 3 };

// The calendar database with its stores: the local one and one per account. A store that does not
// allow events (reminders) hides them from the user and keeps them. Arguments are objects of this
// service, never empty. One thread at a time.
class PLATFORM_EXPORT CalendarStore {
 public:
  virtual ~CalendarStore();
  // Opens the database; empty when it cannot be opened. `options` is the platform's; the system
  // passes 20.
  virtual CalendarDatabasePtr openCalendarDatabase(int options) = 0;
  // All stores; empty when the list cannot be had.
  virtual std::optional<std::vector<CalendarStoreHandlePtr>> allStores(
      const CalendarDatabasePtr& database) = 0;
  // The store of what no service syncs; empty when there is none.
  virtual CalendarStoreHandlePtr localStore(const CalendarDatabasePtr& database) = 0;
  // The next four change the open database; saveCalendarDatabase makes the changes lasting.
  virtual void setStoreAllowsEvents(const CalendarStoreHandlePtr& store, bool allowed) = 0;
  virtual void setStoreAllowsReminders(const CalendarStoreHandlePtr& store, bool allowed) = 0;
  // Makes sure that the store has a calendar of the type that the user can write to.
  virtual void ensureWritableCalendarForEntityType(const CalendarDatabasePtr& database,
                                                   CalendarEntityType type,
                                                   const CalendarStoreHandlePtr& store) = 0;
  // Makes sure that new reminders have a calendar to go to.
  virtual void ensureDefaultCalendarForNewReminders(const CalendarDatabasePtr& database) = 0;
  virtual Status saveCalendarDatabase(const CalendarDatabasePtr& database) = 0;
};

}  // namespace platform
