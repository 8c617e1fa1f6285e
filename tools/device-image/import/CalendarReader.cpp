#include "tools/device-image/import/CalendarReader.h"

#include <algorithm>
#include <map>
#include <optional>
#include <utility>

#include "deviceimage/ContentHash.h"
#include "tools/device-image/import/CalendarComponents.h"
#include "tools/device-image/import/ContentLines.h"

namespace tools {
namespace {

using deviceimage::Dataclass;

// Dividing a calendar repeats its own lines and time zones in every record. No file needs more room
// than this; one made to fill the memory does.
constexpr std::size_t kMinimumRoom = std::size_t{64} << 20U;
constexpr std::size_t kRoomPerByte = 32;

// The components that make one record, in the order of the file.
struct Group {
  Dataclass dataclass = Dataclass::calendars;
  std::string uid;  // empty when the component has none
  std::vector<const CalendarComponent*> components;
};

void checkComponent(CalendarComponent& component, const CalendarObject& calendar) {
  if (component.problem) return;
  if (component.name == "VEVENT" && !component.hasStart && !calendar.hasMethod)
    component.problem =
        Problem{component.line, "the event has no DTSTART", "give it a time to begin"};
}

std::vector<Group> groupsOf(const CalendarObject& calendar) {
  std::vector<Group> groups;
  std::map<std::pair<Dataclass, std::string>, std::size_t> indexByUID;
  for (const CalendarComponent& component : calendar.components) {
    if (!component.isRecord()) continue;
    const Dataclass dataclass =
        component.name == "VEVENT" ? Dataclass::calendars : Dataclass::reminders;
    std::size_t index = groups.size();
    if (!component.uid.empty())
      index = indexByUID.try_emplace({dataclass, component.uid}, index).first->second;
    if (index == groups.size()) groups.push_back({dataclass, component.uid, {}});
    groups[index].components.push_back(&component);
  }
  return groups;
}

// The newest of what the components say; a change counts before the mere stamp.
std::optional<std::int64_t> modifiedOf(const Group& group) {
  std::optional<std::int64_t> newest;
  for (const CalendarComponent* component : group.components)
    newest = std::max(newest, component->changed ? component->changed : component->stamped);
  return newest;
}

// Turns one calendar into records.
class Divider {
 public:
  Divider(std::string_view bytes, CalendarObject& calendar, std::size_t& room, ReadText& result)
      : _bytes(bytes), _calendar(calendar), _room(room), _result(result) {}

  void divide() {
    if (!_isReadable()) return;
    for (CalendarComponent& component : _calendar.components) checkComponent(component, _calendar);
    const bool isWhole = _calendar.problems.empty() &&
                         std::none_of(_calendar.components.begin(), _calendar.components.end(),
                                      [](const CalendarComponent& component) {
                                        return component.problem.has_value();
                                      });
    const std::vector<Group> groups = groupsOf(_calendar);
    _collectZones();
    for (const Group& group : groups) {
      if (_reportProblems(group)) continue;
      if (isWhole && groups.size() == 1)
        _add(group, withLineEnd(_calendar.span.of(_bytes)));
      else if (auto text = _envelope(group))
        _add(group, *std::move(text));
    }
    if (!isWhole || groups.size() != 1) _reportLeftOut();
    _result.problems.insert(_result.problems.end(), _calendar.problems.begin(),
                            _calendar.problems.end());
  }

 private:
  bool _isReadable() {
    if (_calendar.version == "2.0") return true;
    _result.problems.push_back(
        {_calendar.line, "the calendar's VERSION is not 2.0", "export it as iCalendar 2.0"});
    return false;
  }

  void _collectZones() {
    for (const CalendarComponent& component : _calendar.components)
      if (component.name == "VTIMEZONE" && !component.problem)
        _zones.try_emplace(component.timeZoneID, &component);
  }

  // Whether the group has a bad component; each of them is reported.
  bool _reportProblems(const Group& group) {
    bool any = false;
    for (const CalendarComponent* component : group.components) {
      if (!component->problem) continue;
      _result.problems.push_back(*component->problem);
      any = true;
    }
    return any;
  }

  // A calendar for the group alone; empty, and reported, when there is no room for it.
  std::optional<std::string> _envelope(const Group& group) {
    std::vector<Span> parts = _calendar.ownLines;
    for (const CalendarComponent* zone : _zonesOf(group)) parts.push_back(zone->span);
    for (const CalendarComponent* component : group.components) parts.push_back(component->span);
    std::size_t size = 0;
    for (const Span& part : parts) size += part.end - part.begin;
    if (size > _room) {
      _result.problems.push_back({group.components.front()->line,
                                  "the file grows too large when it is divided into records",
                                  "remove properties and time zones that no event needs"});
      return std::nullopt;
    }
    _room -= size;
    std::string text;
    text.reserve(size + 16);
    const bool hasReturns = _calendar.ownLines.front().of(_bytes).ends_with("\r\n");
    const auto add = [&](std::string_view part) {
      text += part;
      // The last line of a file that was cut off has none, and need not be the last one here.
      if (part.ends_with('\n')) return;
      if (hasReturns && !part.ends_with('\r')) text += '\r';
      text += '\n';
    };
    for (const Span& part : parts) add(part.of(_bytes));
    add(_calendar.endLine ? _calendar.endLine->of(_bytes) : "END:VCALENDAR");
    return text;
  }

  // The time zones that the group names, in the order of the file. A zone that the calendar does
  // not define is one that everybody knows by its name.
  std::vector<const CalendarComponent*> _zonesOf(const Group& group) const {
    std::map<std::size_t, const CalendarComponent*> byPlace;
    for (const CalendarComponent* component : group.components)
      for (const std::string& name : component->timeZones)
        if (const auto found = _zones.find(name); found != _zones.end())
          byPlace.emplace(found->second->span.begin, found->second);
    std::vector<const CalendarComponent*> zones;
    zones.reserve(byPlace.size());
    for (const auto& [place, zone] : byPlace) zones.push_back(zone);
    return zones;
  }

  void _add(const Group& group, std::string text) {
    TextRecord record;
    record.dataclass = group.dataclass;
    record.line = group.components.front()->line;
    if (text.size() > kMaximumRecordSize) {
      _result.problems.push_back(
          {record.line, "the record is larger than 16 MiB", "take its attachments out"});
      return;
    }
    record.bytes = std::move(text);
    record.uid = group.uid.empty() ? deviceimage::contentHash(record.bytes) : group.uid;
    record.modified = modifiedOf(group);
    _result.records.push_back(std::move(record));
  }

  // What stands in no record: components of other kinds, and bad time zones.
  void _reportLeftOut() {
    for (const CalendarComponent& component : _calendar.components) {
      if (component.isRecord()) continue;
      if (component.problem)
        _result.problems.push_back(*component.problem);
      else if (component.name != "VTIMEZONE")
        _result.problems.push_back({component.line,
                                    "the " + component.name + " here is no event and no to-do",
                                    "keep it elsewhere, it was left out"});
    }
  }

  std::string_view _bytes;
  CalendarObject& _calendar;
  std::size_t& _room;
  ReadText& _result;
  std::map<std::string, const CalendarComponent*> _zones;
};

}  // namespace

ReadText readCalendars(std::string_view bytes) {
  ReadText result;
  CalendarFile file = cutCalendars(bytes);
  std::size_t room = std::max(kMinimumRoom, bytes.size() * kRoomPerByte);
  for (CalendarObject& calendar : file.calendars) Divider(bytes, calendar, room, result).divide();
  result.problems.insert(result.problems.end(), file.problems.begin(), file.problems.end());
  if (file.calendars.empty() && result.problems.empty())
    result.problems.push_back({1, "the file holds no calendar", "choose an iCalendar file"});
  std::stable_sort(result.problems.begin(), result.problems.end(),
                   [](const Problem& a, const Problem& b) { return a.line < b.line; });
  return result;
}

}  // namespace tools
