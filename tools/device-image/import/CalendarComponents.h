#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "tools/device-image/import/TextRecord.h"

namespace tools {

// Where something stands in a text.
struct Span {
  std::size_t begin = 0;
  std::size_t end = 0;
  std::string_view of(std::string_view bytes) const { return bytes.substr(begin, end - begin); }
};

// One component of a calendar ("VEVENT", "VTIMEZONE"), with what it contains.
struct CalendarComponent {
  std::string name;
  Span span;
  std::size_t line = 0;
  std::string uid;                      // empty without one
  std::set<std::string> timeZones;      // the TZID parameters of its properties
  std::string timeZoneID;               // the TZID property of a VTIMEZONE
  bool hasStart = false;                // DTSTART
  std::optional<std::int64_t> stamped;  // DTSTAMP
  std::optional<std::int64_t> changed;  // LAST-MODIFIED
  std::optional<Problem> problem;       // the first thing wrong with it
  bool isRecord() const { return name == "VEVENT" || name == "VTODO"; }
};

// One calendar, from BEGIN:VCALENDAR to END:VCALENDAR, cut into its parts.
struct CalendarObject {
  Span span;
  std::size_t line = 0;
  std::vector<Span> ownLines;   // its properties, and the BEGIN line first
  std::optional<Span> endLine;  // empty when the calendar is cut off
  std::string version;
  bool hasMethod = false;  // a message about events rather than a set of them
  std::vector<CalendarComponent> components;
  std::vector<Problem> problems;  // those of no component
};

// Cuts a file into its calendars. Components nested deeper than eight levels are bad; nothing
// recurses.
struct CalendarFile {
  std::vector<CalendarObject> calendars;
  std::vector<Problem> problems;  // text outside calendars
};
CalendarFile cutCalendars(std::string_view bytes);

}  // namespace tools
