#include "localdata/LocalStores.h"

#include <algorithm>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "localdata/DataclassFunctions.h"
#include "platform/Services.h"

namespace localdata {

using namespace accountsettings;

namespace {

// The option value with which the calendar database is opened; its meaning is the platform's.
constexpr int kCalendarDatabaseOptions = 20;

// Whether a top-level account other than the device-local one, and other than those of
// `ignoredType`, has the dataclass enabled.
bool anotherAccountServes(std::string_view dataclass, std::string_view ignoredType) {
  const auto accounts = ASSAccountsManager::init()->allBasicAccounts();
  return std::any_of(accounts->begin(), accounts->end(), [&](const AccountPtr& account) {
    const std::optional<std::string> type = account->type();
    return type != kOnMyDeviceAccountType && type != ignoredType &&
           account->isEnabledForDataclass(dataclass);
  });
}

// Local data is asked for only where the answer matters: asking opens a data source.
bool staysAsItIs(std::string_view dataclass, std::string_view ignoredType, bool force) {
  return anotherAccountServes(dataclass, ignoredType) && !force &&
         !AccountSettingsDoesLocalDataExistForDataclass(dataclass);
}

}  // namespace

bool enableAddressBookLocalStore(bool force) {
  if (staysAsItIs(kAccountDataclassContacts, {}, force)) return true;
  return setAddressBookLocalSourceEnabled(true, true);
}

bool enableCalendarLocalStore(bool force) {
  if (!staysAsItIs(kAccountDataclassCalendars, kSubscribedCalendarAccountType, force))
    setCalendarLocalStoreEnabled(kAccountDataclassCalendars, true, true);
  return true;
}

bool enableRemindersLocalStore(bool force) {
  if (!staysAsItIs(kAccountDataclassReminders, {}, force))
    setCalendarLocalStoreEnabled(kAccountDataclassReminders, true, true);
  return true;
}

bool disableAddressBookLocalStore(bool force) {
  return setAddressBookLocalSourceEnabled(false, force);
}

bool disableCalendarLocalStore(bool force) {
  setCalendarLocalStoreEnabled(kAccountDataclassCalendars, false, force);
  return true;
}

bool disableRemindersLocalStore(bool force) {
  setCalendarLocalStoreEnabled(kAccountDataclassReminders, false, force);
  return true;
}

bool setAddressBookLocalSourceEnabled(bool enabled, bool force) {
  platform::ContactsStore& contacts = platform::services().contactsStore;
  const platform::AddressBookPtr book = contacts.openAddressBook();
  if (!book) return true;
  const auto sources = contacts.allSourcesIncludingDisabled(book);
  if (!force && (!sources || sources->size() < 2)) return true;
  const platform::ContactsSourcePtr local = contacts.localSource(book);
  if (!local) return true;
  contacts.setSourceEnabled(local, enabled);
  const platform::Status saved = contacts.saveAddressBook(book);
  if (saved.isSuccess() || !saved.error) return true;
  // The text is the same for showing and for hiding.
  platform::logToSystem("Failed to hide the AB local source. Error = %@", saved.error);
  return false;
}

void setCalendarLocalStoreEnabled(std::string_view dataclass, bool enabled, bool force) {
  platform::CalendarStore& calendars = platform::services().calendarStore;
  const auto database = calendars.openCalendarDatabase(kCalendarDatabaseOptions);
  if (!database) return;
  const auto stores = calendars.allStores(database);
  if (!force && (!stores || stores->size() < 2)) return;
  const platform::CalendarStoreHandlePtr local = calendars.localStore(database);
  if (!local) return;
  if (dataclass == kAccountDataclassCalendars) {
    calendars.setStoreAllowsEvents(local, enabled);
    calendars.ensureWritableCalendarForEntityType(database, platform::CalendarEntityType::events,
                                                  local);
  } else if (dataclass == kAccountDataclassReminders) {
    calendars.setStoreAllowsReminders(local, enabled);
    calendars.ensureWritableCalendarForEntityType(database, platform::CalendarEntityType::reminders,
                                                  local);
    calendars.ensureDefaultCalendarForNewReminders(database);
  }
  calendars.saveCalendarDatabase(database).ignore("showing a store is not worth a log line");
}

}  // namespace localdata
