#pragma once

#include <array>
#include <optional>
#include <string_view>

#include "platform/SyncDataType.h"

namespace deviceimage {

// The kinds of data that a device image keeps records of, in the order in which they are listed.
enum class Dataclass { mail, contacts, calendars, reminders, bookmarks, notes };

inline constexpr std::array<Dataclass, 6> kDataclasses = {
    Dataclass::mail,      Dataclass::contacts,  Dataclass::calendars,
    Dataclass::reminders, Dataclass::bookmarks, Dataclass::notes};

// "mail", "contacts", "calendars", "reminders", "bookmarks" or "notes".
std::string_view dataclassName(Dataclass dataclass);
// The dataclass with that name, or empty.
std::optional<Dataclass> dataclassNamed(std::string_view name);

// "com.vantor.Dataclass.Contacts" and its like, as accounts list them.
std::string_view dataclassIdentifier(Dataclass dataclass);
// The dataclass with that identifier; empty for one that the image keeps no records of.
std::optional<Dataclass> dataclassWithIdentifier(std::string_view identifier);

// What one record of the dataclass is called in the databases: "mailaccount", "contact", "event",
// "todo", "bookmark" or "note".
std::string_view recordKind(Dataclass dataclass);

// Events and reminders share a sync type, one database and one store per account.
platform::SyncDataType syncTypeOf(Dataclass dataclass);

// The device keeps one store of the type, which serves either the device itself or one account.
bool isSingleStoreType(platform::SyncDataType type);

}  // namespace deviceimage
