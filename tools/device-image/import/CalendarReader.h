#pragma once

#include <string_view>

#include "tools/device-image/import/TextRecord.h"

namespace tools {

// The events and to-dos of an iCalendar 2.0 file: each record's dataclass is calendars or
// reminders.
//
// A record is everything of its kind that has one UID: the event with its exceptions. It is kept as
// a calendar of its own, so that each record is a complete iCalendar text:
//  - A calendar that holds one record is kept byte for byte, from its BEGIN line to its END line.
//  - A calendar that holds several is divided. Each record then has the calendar's own lines (those
//    outside its components), the time zones that it names, and its components, each of these byte
//    for byte and in the order of the file.
// What stands around a calendar is not part of it, and an END line without a line end gets one, so
// that a record is the same wherever in a file it stands.
// A component without UID is a record of its own. Several calendars in one file are read one by
// one: one UID in two of them makes two records. When one component of a record is bad, the record
// is left out whole, since an event without its exceptions would say something else.
ReadText readCalendars(std::string_view bytes);

}  // namespace tools
