#pragma once

#include <string_view>

namespace accountsettings {

// Keys of an account's property dictionary.
inline constexpr std::string_view kAccountIdentifier = "Identifier";
// The identifier of the account's sync store.
inline constexpr std::string_view kAccountSyncIdentifier = "Sync Identifier";
// One of the account types below.
inline constexpr std::string_view kAccountType = "Type";
// The name of the class that implements the full account; for mail accounts the mail account class.
inline constexpr std::string_view kAccountClass = "Class";
inline constexpr std::string_view kAccountDisplayName = "DisplayName";
inline constexpr std::string_view kAccountUsername = "Username";
// Array of dataclasses that the user has turned on.
inline constexpr std::string_view kAccountEnabledDataclasses = "Enabled Dataclasses";
// Array of dataclasses that the service has granted.
inline constexpr std::string_view kAccountProvisionedDataclasses = "Provisioned Dataclasses";
// A record takes its supported dataclasses from the catalogue of types, not from its own
// properties.
inline constexpr std::string_view kAccountSupportedDataclasses = "Supported Dataclasses";
inline constexpr std::string_view kAccountTypeString = "Type String";
inline constexpr std::string_view kAccountShortTypeString = "Short Type String";
inline constexpr std::string_view kAccountPreventRecentsSyncing = "Prevent Recents Syncing";
inline constexpr std::string_view kCalendarsAccountSubscribedCalendars = "Subscribed Calendars";
// Boolean: local calendar or reminder data was merged into the account.
inline constexpr std::string_view kAccountCalendarsWereMigrated = "CalendarsWereMigrated";
// Array of property dictionaries, one per child account of a top-level account.
inline constexpr std::string_view kAccountChildAccounts = "ChildAccounts";

// Account types. A type is valid only when the catalogue of types has an entry for it.
inline constexpr std::string_view kSubscribedCalendarAccountType = "Subscribed Calendar";
inline constexpr std::string_view kCalDAVAccountType = "CalDAV";
inline constexpr std::string_view kCardDAVAccountType = "CardDAV";
inline constexpr std::string_view kBookmarkDAVAccountType = "BookmarkDAV";
inline constexpr std::string_view kSMTPAccountType = "SMTP";
inline constexpr std::string_view kExchangeAccountType = "Exchange";
inline constexpr std::string_view kLDAPAccountType = "LDAP";
inline constexpr std::string_view kMailAccountType = "Mail";
inline constexpr std::string_view kQuillnetAccountType = "Quillnet";
inline constexpr std::string_view kGmailAccountType = "Gmail";
inline constexpr std::string_view kYahooAccountType = "Yahoo";
inline constexpr std::string_view kOnMyDeviceAccountType = "OnMyDevice";
inline constexpr std::string_view kIMAPNotesAccountType = "IMAPNotes";
inline constexpr std::string_view kVantorAccountType = "VantorAccount";
inline constexpr std::string_view kBriskIMAPAccountType = "BriskIMAP";

// Dataclasses: the kinds of user data that an account may offer.
inline constexpr std::string_view kAccountDataclassMail = "com.vantor.Dataclass.Mail";
inline constexpr std::string_view kAccountDataclassContacts = "com.vantor.Dataclass.Contacts";
inline constexpr std::string_view kAccountDataclassCalendars = "com.vantor.Dataclass.Calendars";
inline constexpr std::string_view kAccountDataclassReminders = "com.vantor.Dataclass.Reminders";
inline constexpr std::string_view kAccountDataclassBookmarks = "com.vantor.Dataclass.Bookmarks";
inline constexpr std::string_view kAccountDataclassNotes = "com.vantor.Dataclass.Notes";
inline constexpr std::string_view kAccountDataclassMediaStream = "com.vantor.Dataclass.MediaStream";
inline constexpr std::string_view kAccountDataclassDeviceLocator =
    "com.vantor.Dataclass.DeviceLocator";
inline constexpr std::string_view kAccountDataclassContactsSearch =
    "com.vantor.Dataclass.ContactsSearch";
inline constexpr std::string_view kAccountDataclassBackup = "com.vantor.Dataclass.Backup";
inline constexpr std::string_view kAccountDataclassUbiquity = "com.vantor.Dataclass.Ubiquity";
inline constexpr std::string_view kAccountDataclassKeyValue = "com.vantor.Dataclass.KeyValue";
inline constexpr std::string_view kAccountDataclassShoebox = "com.vantor.Dataclass.Shoebox";
inline constexpr std::string_view kAccountDataclassSharedStreams =
    "com.vantor.Dataclass.SharedStreams";

// What a user may be offered when a dataclass is turned on or off, and when an account is deleted.
inline constexpr std::string_view kDataclassToggleActionNone = "None";
// Never offered as the last choice for a dataclass of which the device keeps one store only.
inline constexpr std::string_view kDataclassToggleActionKeepLocalData = "Keep Local Data";
inline constexpr std::string_view kDataclassToggleActionMergeLocalData = "Merge Local Data";
inline constexpr std::string_view kDataclassToggleActionDeleteLocalData = "Delete Local Data";
inline constexpr std::string_view kDataclassToggleActionMergeSyncData = "Merge Sync Data";
inline constexpr std::string_view kDataclassToggleActionDeleteSyncData = "Delete Sync Data";
inline constexpr std::string_view kAccountDeleteActionMergeData = "Merge Data";
inline constexpr std::string_view kAccountDeleteActionDeleteData = "Delete Data";

// Keys of one type's entry in the catalogue of account types. A missing key means none or false.
inline constexpr std::string_view kPropertiesSupportedDataclasses = "Supported Dataclasses";
inline constexpr std::string_view kPropertiesEnableDataclassActions = "Enable Actions";
inline constexpr std::string_view kPropertiesDisableDataclassActions = "Disable Actions";
inline constexpr std::string_view kPropertiesDeleteAccountActions = "Delete Account Actions";
inline constexpr std::string_view kPropertiesShowRemindersSeparately = "Show Reminders Separately";

// Keys of one dataclass's entry in the catalogue of dataclasses. A missing key means false.
// The device can keep local data beside an account's synced data.
inline constexpr std::string_view kDataclassSupportsMultipleStores = "Supports Multiple Stores";
inline constexpr std::string_view kDataclassDisplaySwitch = "Display Dataclass Switch";
inline constexpr std::string_view kDataclassRequiresUserConfirmation = "Requires User Confirmation";

// The file behind the lock that marks a migration of legacy settings; for other processes to look
// at.
inline constexpr std::string_view kAccountMigrationLockFilename = "/tmp/AccountMigrationInProgress";

}  // namespace accountsettings
