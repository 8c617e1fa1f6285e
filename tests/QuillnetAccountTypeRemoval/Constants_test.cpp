#include <gtest/gtest.h>

#include "QuillnetAccountTypeRemoval/AccountConstants.h"

namespace accountsettings {
namespace {

TEST(Constants, PropertyKeysHaveTheTextsOfTheSettingsFile) {
  EXPECT_EQ(kAccountIdentifier, "Identifier");
  EXPECT_EQ(kAccountSyncIdentifier, "Sync Identifier");
  EXPECT_EQ(kAccountType, "Type");
  EXPECT_EQ(kAccountClass, "Class");
  EXPECT_EQ(kAccountDisplayName, "DisplayName");
  EXPECT_EQ(kAccountUsername, "Username");
  EXPECT_EQ(kAccountEnabledDataclasses, "Enabled Dataclasses");
  EXPECT_EQ(kAccountProvisionedDataclasses, "Provisioned Dataclasses");
  EXPECT_EQ(kAccountSupportedDataclasses, "Supported Dataclasses");
  EXPECT_EQ(kAccountTypeString, "Type String");
  EXPECT_EQ(kAccountShortTypeString, "Short Type String");
  EXPECT_EQ(kAccountPreventRecentsSyncing, "Prevent Recents Syncing");
  EXPECT_EQ(kCalendarsAccountSubscribedCalendars, "Subscribed Calendars");
  EXPECT_EQ(kAccountCalendarsWereMigrated, "CalendarsWereMigrated");
  EXPECT_EQ(kAccountChildAccounts, "ChildAccounts");
}

TEST(Constants, TheMigrationLockHasTheNameThatOtherProcessesLookAt) {
  EXPECT_EQ(kAccountMigrationLockFilename, "/tmp/AccountMigrationInProgress");
}

TEST(Constants, AccountTypesHaveTheTextsOfTheSettingsFile) {
  EXPECT_EQ(kSubscribedCalendarAccountType, "Subscribed Calendar");
  EXPECT_EQ(kCalDAVAccountType, "CalDAV");
  EXPECT_EQ(kCardDAVAccountType, "CardDAV");
  EXPECT_EQ(kBookmarkDAVAccountType, "BookmarkDAV");
  EXPECT_EQ(kSMTPAccountType, "SMTP");
  EXPECT_EQ(kExchangeAccountType, "Exchange");
  EXPECT_EQ(kLDAPAccountType, "LDAP");
  EXPECT_EQ(kMailAccountType, "Mail");
  EXPECT_EQ(kQuillnetAccountType, "Quillnet");
  EXPECT_EQ(kGmailAccountType, "Gmail");
  EXPECT_EQ(kYahooAccountType, "Yahoo");
  EXPECT_EQ(kOnMyDeviceAccountType, "OnMyDevice");
  EXPECT_EQ(kIMAPNotesAccountType, "IMAPNotes");
  EXPECT_EQ(kVantorAccountType, "VantorAccount");
  EXPECT_EQ(kBriskIMAPAccountType, "BriskIMAP");
}

TEST(Constants, DataclassesHaveTheTextsOfTheSettingsFile) {
  EXPECT_EQ(kAccountDataclassMail, "com.vantor.Dataclass.Mail");
  EXPECT_EQ(kAccountDataclassContacts, "com.vantor.Dataclass.Contacts");
  EXPECT_EQ(kAccountDataclassCalendars, "com.vantor.Dataclass.Calendars");
  EXPECT_EQ(kAccountDataclassReminders, "com.vantor.Dataclass.Reminders");
  EXPECT_EQ(kAccountDataclassBookmarks, "com.vantor.Dataclass.Bookmarks");
  EXPECT_EQ(kAccountDataclassNotes, "com.vantor.Dataclass.Notes");
  EXPECT_EQ(kAccountDataclassMediaStream, "com.vantor.Dataclass.MediaStream");
  EXPECT_EQ(kAccountDataclassDeviceLocator, "com.vantor.Dataclass.DeviceLocator");
  EXPECT_EQ(kAccountDataclassContactsSearch, "com.vantor.Dataclass.ContactsSearch");
  EXPECT_EQ(kAccountDataclassBackup, "com.vantor.Dataclass.Backup");
  EXPECT_EQ(kAccountDataclassUbiquity, "com.vantor.Dataclass.Ubiquity");
  EXPECT_EQ(kAccountDataclassKeyValue, "com.vantor.Dataclass.KeyValue");
  EXPECT_EQ(kAccountDataclassShoebox, "com.vantor.Dataclass.Shoebox");
  EXPECT_EQ(kAccountDataclassSharedStreams, "com.vantor.Dataclass.SharedStreams");
}

TEST(Constants, UserActionsHaveTheTextsOfTheCatalogue) {
  EXPECT_EQ(kDataclassToggleActionNone, "None");
  EXPECT_EQ(kDataclassToggleActionKeepLocalData, "Keep Local Data");
  EXPECT_EQ(kDataclassToggleActionMergeLocalData, "Merge Local Data");
  EXPECT_EQ(kDataclassToggleActionDeleteLocalData, "Delete Local Data");
  EXPECT_EQ(kDataclassToggleActionMergeSyncData, "Merge Sync Data");
  EXPECT_EQ(kDataclassToggleActionDeleteSyncData, "Delete Sync Data");
  EXPECT_EQ(kAccountDeleteActionMergeData, "Merge Data");
  EXPECT_EQ(kAccountDeleteActionDeleteData, "Delete Data");
}

TEST(Constants, CatalogueKeysHaveTheTextsOfTheResources) {
  EXPECT_EQ(kPropertiesSupportedDataclasses, "Supported Dataclasses");
  EXPECT_EQ(kPropertiesEnableDataclassActions, "Enable Actions");
  EXPECT_EQ(kPropertiesDisableDataclassActions, "Disable Actions");
  EXPECT_EQ(kPropertiesDeleteAccountActions, "Delete Account Actions");
  EXPECT_EQ(kPropertiesShowRemindersSeparately, "Show Reminders Separately");
  EXPECT_EQ(kDataclassSupportsMultipleStores, "Supports Multiple Stores");
  EXPECT_EQ(kDataclassDisplaySwitch, "Display Dataclass Switch");
  EXPECT_EQ(kDataclassRequiresUserConfirmation, "Requires User Confirmation");
}

}  // namespace
}  // namespace accountsettings
