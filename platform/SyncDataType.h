#pragma once

namespace platform {

// One kind of data that the platform syncs. "No such kind" is an empty std::optional.
enum class SyncDataType { mailAccounts, contacts, calendars, bookmarks, notes };

inline constexpr SyncDataType MailAccountsSyncType = SyncDataType::mailAccounts;
inline constexpr SyncDataType ContactsSyncType = SyncDataType::contacts;
// Events and reminders both; a source option selects one of the two.
inline constexpr SyncDataType CalendarsSyncType = SyncDataType::calendars;
inline constexpr SyncDataType BookmarksSyncType = SyncDataType::bookmarks;
inline constexpr SyncDataType NotesSyncType = SyncDataType::notes;

}  // namespace platform
