#pragma once

#include <string_view>

// Showing and hiding the stores of what lives on the device alone, in the contacts and the calendar
// database. What fails is logged and ends in the stated answer; nothing is raised.
namespace localdata {

// Show the local contacts source (calendar store for events, for reminders), unless `force` is
// false, another top-level account serves the dataclass and the device holds no local data of it:
// then nothing is touched. An account that is about to be retired still serves its dataclasses
// here. A subscribed calendar does not count as serving calendars.
//
// The first answers whether the address book could be saved; the other two always answer true.
bool enableAddressBookLocalStore(bool force);
bool enableCalendarLocalStore(bool force);
bool enableRemindersLocalStore(bool force);

// Hide them. Without `force` a device whose database has the local store alone is left as it is.
bool disableAddressBookLocalStore(bool force);
bool disableCalendarLocalStore(bool force);
bool disableRemindersLocalStore(bool force);

// Sets whether the local contacts source is enabled. Without `force` nothing happens on a device
// with fewer than two sources, disabled ones counted. False only when the save failed with an
// error; a failed save that gives none counts as done.
bool setAddressBookLocalSourceEnabled(bool enabled, bool force);

// Sets whether the local calendar store allows events (calendars) or reminders. A calendar that the
// user can write to is made sure of also when the store is hidden. Another dataclass changes
// nothing, though the database is opened and saved all the same.
void setCalendarLocalStoreEnabled(std::string_view dataclass, bool enabled, bool force);

}  // namespace localdata
