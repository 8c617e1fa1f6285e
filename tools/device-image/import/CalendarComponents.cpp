#include "tools/device-image/import/CalendarComponents.h"

#include <utility>

#include "tools/common/Timestamps.h"
#include "tools/device-image/import/ContentLines.h"

namespace tools {
namespace {

constexpr std::size_t kMaximumNesting = 8;

// The components that lie directly in a calendar. One that begins inside another tells that the
// other was never ended.
bool isOutermostComponent(std::string_view name) {
  return name == "VEVENT" || name == "VTODO" || name == "VTIMEZONE" || name == "VJOURNAL" ||
         name == "VFREEBUSY";
}

void fail(CalendarComponent& component, std::size_t line, std::string what, std::string remedy) {
  if (!component.problem) component.problem = Problem{line, std::move(what), std::move(remedy)};
}

// What is wrong with a line as such.
std::optional<Problem> problemOf(const ContentLine& line) {
  if (!line.isText)
    return Problem{line.number, "the line is not UTF-8 text", "save the file as UTF-8"};
  if (line.name.empty())
    return Problem{line.number, "the line is no iCalendar property (NAME:VALUE)",
                   "correct the line, or begin it with a blank when it continues the one above"};
  return std::nullopt;
}

void takeUID(CalendarComponent& component, const ContentLine& line) {
  if (!component.uid.empty() && component.uid != line.value)
    fail(component, line.number, "the component has a second UID",
         "keep one UID in each component");
  if (line.value.size() > kMaximumUIDSize)
    fail(component, line.number, "the UID is longer than 1000 bytes", "give it a shorter UID");
  component.uid = line.value;
}

void takeProperty(CalendarComponent& component, const ContentLine& line, bool nested) {
  if (const auto problem = problemOf(line); problem && !component.problem)
    component.problem = problem;
  if (!line.parameters.empty())
    if (auto zone = line.parameter("TZID")) component.timeZones.insert(*std::move(zone));
  if (nested) return;
  if (line.name == "UID") takeUID(component, line);
  if (line.name == "TZID") component.timeZoneID = line.value;
  if (line.name == "DTSTART") component.hasStart = true;
  if (line.name == "DTSTAMP") component.stamped = secondsOfISODate(line.value);
  if (line.name == "LAST-MODIFIED") component.changed = secondsOfISODate(line.value);
}

// Reads a file line by line; knows in which calendar and components it stands.
class Cutter {
 public:
  void take(const ContentLine& line) {
    if (line.is("BEGIN", "VCALENDAR"))
      _beginCalendar(line);
    else if (!_inCalendar)
      _takeStray(line);
    else if (line.is("END", "VCALENDAR"))
      _endCalendar(line);
    else if (line.name == "BEGIN")
      _beginComponent(line);
    else if (line.name == "END")
      _endComponent(line);
    else if (!line.isBlank)
      _takeProperty(line);
  }

  CalendarFile finish() {
    if (_inCalendar) _breakOff();
    return std::move(_file);
  }

 private:
  CalendarObject& _calendar() { return _file.calendars.back(); }
  CalendarComponent& _component() { return _calendar().components.back(); }

  void _beginCalendar(const ContentLine& line) {
    if (_inCalendar) _breakOff();
    _inCalendar = true;
    _strayReported = false;
    CalendarObject calendar;
    calendar.span = {line.begin, line.end};
    calendar.line = line.number;
    calendar.ownLines.push_back({line.begin, line.end});
    _file.calendars.push_back(std::move(calendar));
  }

  void _takeStray(const ContentLine& line) {
    if (line.isBlank || std::exchange(_strayReported, true)) return;
    _file.problems.push_back({line.number, "the text here belongs to no calendar",
                              "put it between BEGIN:VCALENDAR and END:VCALENDAR, or remove it"});
  }

  void _endCalendar(const ContentLine& line) {
    _leaveComponentOpen();
    _calendar().span.end = line.end;
    _calendar().endLine = Span{line.begin, line.end};
    _inCalendar = false;
  }

  // The calendar ends without an END line. Its whole components are good all the same.
  void _breakOff() {
    _leaveComponentOpen();
    _calendar().problems.push_back({_calendar().line,
                                    "the calendar that begins here has no END:VCALENDAR",
                                    "add the END:VCALENDAR line, or restore what is missing"});
    _inCalendar = false;
  }

  void _leaveComponentOpen() {
    if (_open.empty()) return;
    fail(_component(), _component().line,
         "the " + _component().name + " that begins here has no END:" + _component().name,
         "add the END line, or restore what is missing");
    _open.clear();
  }

  void _beginComponent(const ContentLine& line) {
    const std::string name = upperCased(line.value);
    if (isOutermostComponent(name)) _leaveComponentOpen();
    if (_open.empty()) {
      CalendarComponent component;
      component.name = name;
      component.span = {line.begin, line.end};
      component.line = line.number;
      _calendar().components.push_back(std::move(component));
    }
    if (_open.size() == kMaximumNesting)
      fail(_component(), line.number, "the component is nested deeper than 8 levels",
           "remove the innermost components");
    else
      _open.push_back(name);
  }

  void _endComponent(const ContentLine& line) {
    const std::string name = upperCased(line.value);
    if (_open.empty()) {
      _calendar().problems.push_back({line.number, "this END has no BEGIN before it",
                                      "remove the line, or add the BEGIN line that is missing"});
      return;
    }
    _component().span.end = line.end;
    if (name == _open.back()) {
      _open.pop_back();
      return;
    }
    fail(_component(), line.number, "END:" + _open.back() + " is missing before this line",
         "add the line, or restore what is missing");
    if (name == _open.front()) _open.clear();
  }

  void _takeProperty(const ContentLine& line) {
    if (!_open.empty()) {
      takeProperty(_component(), line, _open.size() > 1);
      return;
    }
    if (auto problem = problemOf(line)) {
      _calendar().problems.push_back(*std::move(problem));
      return;
    }
    _calendar().ownLines.push_back({line.begin, line.end});
    if (line.name == "VERSION") _calendar().version = line.value;
    if (line.name == "METHOD") _calendar().hasMethod = true;
  }

  CalendarFile _file;
  bool _inCalendar = false;
  bool _strayReported = false;     // one report for a whole run of lines outside calendars
  std::vector<std::string> _open;  // the names of the components that the reader is in
};

}  // namespace

CalendarFile cutCalendars(std::string_view bytes) {
  Cutter cutter;
  ContentLines lines(bytes);
  while (const std::optional<ContentLine> line = lines.next()) cutter.take(*line);
  return cutter.finish();
}

}  // namespace tools
