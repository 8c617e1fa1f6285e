#include "deviceimage/Dataclass.h"

#include <cstddef>

namespace deviceimage {
namespace {

struct Entry {
  std::string_view name;
  std::string_view identifier;
  std::string_view kind;
  platform::SyncDataType type;
};

// In the order of the enumeration.
constexpr std::array<Entry, kDataclasses.size()> kEntries = {{
    {"mail", "com.vantor.Dataclass.Mail", "mailaccount", platform::MailAccountsSyncType},
    {"contacts", "com.vantor.Dataclass.Contacts", "contact", platform::ContactsSyncType},
    {"calendars", "com.vantor.Dataclass.Calendars", "event", platform::CalendarsSyncType},
    {"reminders", "com.vantor.Dataclass.Reminders", "todo", platform::CalendarsSyncType},
    {"bookmarks", "com.vantor.Dataclass.Bookmarks", "bookmark", platform::BookmarksSyncType},
    {"notes", "com.vantor.Dataclass.Notes", "note", platform::NotesSyncType},
}};

const Entry& entryOf(Dataclass dataclass) { return kEntries[static_cast<std::size_t>(dataclass)]; }

}  // namespace

std::string_view dataclassName(Dataclass dataclass) { return entryOf(dataclass).name; }

std::optional<Dataclass> dataclassNamed(std::string_view name) {
  for (const Dataclass dataclass : kDataclasses)
    if (entryOf(dataclass).name == name) return dataclass;
  return std::nullopt;
}

std::string_view dataclassIdentifier(Dataclass dataclass) { return entryOf(dataclass).identifier; }

std::optional<Dataclass> dataclassWithIdentifier(std::string_view identifier) {
  for (const Dataclass dataclass : kDataclasses)
    if (entryOf(dataclass).identifier == identifier) return dataclass;
  return std::nullopt;
}

std::string_view recordKind(Dataclass dataclass) { return entryOf(dataclass).kind; }

platform::SyncDataType syncTypeOf(Dataclass dataclass) { return entryOf(dataclass).type; }

bool isSingleStoreType(platform::SyncDataType type) {
  return type == platform::BookmarksSyncType || type == platform::MailAccountsSyncType;
}

}  // namespace deviceimage
