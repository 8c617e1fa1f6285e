#pragma once

#include "deviceimage/Database.h"
#include "platform/CalendarStore.h"

namespace deviceimage {

// The calendar database with its active stores. An open database knows the stores that there were
// when it was opened; without a database in the image it has none. Its changes wait for
// saveCalendarDatabase, which makes them in the order in which they were asked for.
//
// A writable calendar that has to be made is called "Calendar" or "Reminders". The default calendar
// for new reminders is the first active store's that has one, else the local store's first writable
// calendar of reminders becomes it.
class ImageCalendarStore : public platform::CalendarStore {
 public:
  // `databases` is shared with the other services of the image and outlives this.
  explicit ImageCalendarStore(DatabaseSet& databases) : _databases(databases) {}

  platform::CalendarDatabasePtr openCalendarDatabase(int options) override;
  std::optional<std::vector<platform::CalendarStoreHandlePtr>> allStores(
      const platform::CalendarDatabasePtr& database) override;
  platform::CalendarStoreHandlePtr localStore(
      const platform::CalendarDatabasePtr& database) override;
  void setStoreAllowsEvents(const platform::CalendarStoreHandlePtr& store, bool allowed) override;
  void setStoreAllowsReminders(const platform::CalendarStoreHandlePtr& store,
                               bool allowed) override;
  void ensureWritableCalendarForEntityType(const platform::CalendarDatabasePtr& database,
                                           platform::CalendarEntityType type,
                                           const platform::CalendarStoreHandlePtr& store) override;
  void ensureDefaultCalendarForNewReminders(const platform::CalendarDatabasePtr& database) override;
  platform::Status saveCalendarDatabase(const platform::CalendarDatabasePtr& database) override;

 private:
  DatabaseSet& _databases;
};

}  // namespace deviceimage
