// The whole road, line by line: what a run does to the device and what it says.

#include <sys/stat.h>

#include "tests/migrator/MigratorTest.h"

namespace migrator {
namespace {

class WholeRun : public MigratorTest {
 protected:
  using Sources = platform::InMemorySyncDataSource;
  using RecordKind = Sources::RecordKind;
  using Records = std::vector<Sources::Record>;

  static Dictionary mailInfo(const char* identifier) {
    return with(accountInfo("Mail", identifier, {"Mail", "Notes"}),
                {{"AccountPath", "Mail/IMAP-ada"},
                 {"Port", 993},
                 {"SSL", true},
                 {"Weight", 0.5},
                 {"Since", propertylist::Date{700000000}},
                 {"Token", propertylist::Bytes{0, 255, 1}},
                 {"ChildAccounts",
                  Array{Value(Dictionary{
                      {"Type", "SMTP"}, {"Class", "SMTPAccount"}, {"Identifier", "smtp"}})}}});
  }
};

TEST_F(WholeRun, RetiresContactsAndBookmarksAndLeavesTheMailAccountsAlone) {
  writeAccounts({mailInfo("before"),
                 with(selectedInfo("q", {"Contacts", "Bookmarks"}), {{"DisplayName", "Ada"}}),
                 mailInfo("behind")});
  device.syncDataSource.stores[{"Quillnet:ada", "Contacts"}].records = {{"1", "one"}, {"2", "two"}};
  device.syncDataSource.stores[{std::nullopt, "Contacts"}] = {{{"2", "two"}}, true};
  device.syncDataSource.stores[{"Quillnet:ada", "Bookmarks"}].records = {{"b", "link"}};
  device.contactsStore.sources = {{"local", false, true}, {"Quillnet", true, false}};

  EXPECT_TRUE(migrator.performMigration());

  EXPECT_EQ(device.logLines(), (Lines{
                                   "Checking account <ASSBasicAccount: before> of type Mail",
                                   "Checking account <ASSBasicAccount: q> of type Quillnet",
                                   "Merging com.vantor.Dataclass.Contacts to the localstore",
                                   "mergeSyncDataForDataclass",
                                   "removeDataStoreForDataclass",
                                   "DeviceLocalAccount missing. Creating...",
                                   "Merging com.vantor.Dataclass.Bookmarks to the localstore",
                                   "createLocalDataSourceForDataclass",
                                   "Checking account <ASSBasicAccount: behind> of type Mail",
                               }));
  EXPECT_EQ(device.journal, (Journal{
                                "log: Checking account <ASSBasicAccount: before> of type Mail",
                                "log: Checking account <ASSBasicAccount: q> of type Quillnet",
                                "log: Merging com.vantor.Dataclass.Contacts to the localstore",
                                "log: mergeSyncDataForDataclass",
                                "dataclassNameForSyncType(Contacts)",
                                "createDataSource(Contacts, none, none)",
                                "dataclassNameForSyncType(Contacts)",
                                "createDataSource(Contacts, Quillnet:ada, none)",
                                "migrateRecords(Quillnet:ada Contacts, local Contacts)",
                                "commit(local Contacts)",
                                "deleteDataSource(local Contacts)",
                                "commit(Quillnet:ada Contacts)",
                                "deleteDataSource(Quillnet:ada Contacts)",
                                "log: removeDataStoreForDataclass",
                                "dataclassNameForSyncType(Contacts)",
                                "createDataSource(Contacts, Quillnet:ada, none)",
                                "removeStore(Quillnet:ada Contacts, false)",
                                "commit(Quillnet:ada Contacts)",
                                "deleteDataSource(Quillnet:ada Contacts)",
                                "dataclassNameForSyncType(Contacts)",
                                "createDataSource(Contacts, none, none)",
                                "clearSyncAnchors(local Contacts)",
                                "deleteDataSource(local Contacts)",
                                "log: DeviceLocalAccount missing. Creating...",
                                "dataclassNameForSyncType(Contacts)",
                                "createDataSource(Contacts, none, none)",
                                "countRecords(local Contacts)",
                                "deleteDataSource(local Contacts)",
                                "openAddressBook()",
                                "allSourcesIncludingDisabled()",
                                "localSource()",
                                "setSourceEnabled(local, true)",
                                "saveAddressBook()",
                                "log: Merging com.vantor.Dataclass.Bookmarks to the localstore",
                                "log: createLocalDataSourceForDataclass",
                                "setTetheredSyncingDisabled(Bookmarks, false)",
                                "dataclassNameForSyncType(Bookmarks)",
                                "createDataSource(Bookmarks, none, none)",
                                "commit(local Bookmarks)",
                                "deleteDataSource(local Bookmarks)",
                                "dataclassNameForSyncType(Bookmarks)",
                                "createDataSource(Bookmarks, none, none)",
                                "clearSyncAnchors(local Bookmarks)",
                                "deleteDataSource(local Bookmarks)",
                                "log: Checking account <ASSBasicAccount: behind> of type Mail",
                            }));

  EXPECT_EQ(
      device.readSettings(),
      (Dictionary{{"Version", 12}, {"Accounts", Array{mailInfo("before"), mailInfo("behind")}}}));
  const Sources& sources = device.syncDataSource;
  EXPECT_EQ(sources.records(std::nullopt, "Contacts"), (Records{{"2", "two"}, {"1", "one"}}));
  EXPECT_FALSE(sources.storeExists("Quillnet:ada", "Contacts"));
  EXPECT_TRUE(sources.storeExists(std::nullopt, "Bookmarks"));
  EXPECT_EQ(sources.records("Quillnet:ada", "Bookmarks"), (Records{{"b", "link"}}));
  EXPECT_FALSE(device.syncDataSource.stores.at({std::nullopt, "Contacts"}).hasAnchors);
  EXPECT_EQ(sources.openSources(), 0);
  EXPECT_TRUE(device.contactsStore.isSourceEnabled("local"));
}

TEST_F(WholeRun, WritesAPrivateBinaryFileAndLeavesNoOther) {
  writeAccounts({selectedInfo("q", {"Contacts"}), mailInfo("m")});
  migrator.performMigration();
  EXPECT_TRUE(device.readSettingsBytes()->starts_with("bplist00"));
  struct stat status = {};
  ASSERT_EQ(::stat(device.settingsPath().c_str(), &status), 0);
  EXPECT_EQ(status.st_mode, S_IFREG | S_IRUSR | S_IWUSR);
  EXPECT_EQ(device.temporaryFiles(), Lines{});
}

TEST_F(WholeRun, RetiresEventsOfTheCalendarChildAndRemindersOfTheAccountItself) {
  const Dictionary child{
      {"Type", "CalDAV"}, {"Class", "MobileCalDAVAccount"}, {"Identifier", "cal"}};
  writeAccounts({with(selectedInfo("q", {"Reminders", "Calendars"}),
                      {{"ChildAccounts", Array{Value(child)}}}),
                 deviceLocalInfo({})});
  device.syncDataSource.stores[{"cal", "Calendars"}].records = {{"e", "event", RecordKind::event}};
  device.syncDataSource.stores[{"Quillnet:ada", "Calendars"}].records = {
      {"r", "reminder", RecordKind::reminder}};
  device.calendarStore.contents.stores = {{"local", true, false, false}};

  EXPECT_TRUE(migrator.performMigration());

  EXPECT_EQ(device.journal,
            (Journal{
                "log: Checking account <ASSBasicAccount: q> of type Quillnet",
                "log: Merging com.vantor.Dataclass.Calendars to the localstore",
                "log: mergeSyncDataForDataclass",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, none, {EventsOnly})",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, cal, {EventsOnly})",
                "countRecords(cal Calendars {EventsOnly})",
                "migrateRecords(cal Calendars {EventsOnly}, local Calendars {EventsOnly})",
                "commit(local Calendars {EventsOnly})",
                "deleteDataSource(local Calendars {EventsOnly})",
                "commit(cal Calendars {EventsOnly})",
                "deleteDataSource(cal Calendars {EventsOnly})",
                "log: removeDataStoreForDataclass",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, cal, {EventsOnly})",
                "countRecords(cal Calendars {EventsOnly})",
                "clearAllRecords(cal Calendars {EventsOnly})",
                "commit(cal Calendars {EventsOnly})",
                "deleteDataSource(cal Calendars {EventsOnly})",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, none, {EventsOnly})",
                "clearSyncAnchors(local Calendars {EventsOnly})",
                "deleteDataSource(local Calendars {EventsOnly})",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, none, {EventsOnly})",
                "countRecords(local Calendars {EventsOnly})",
                "deleteDataSource(local Calendars {EventsOnly})",
                "openCalendarDatabase(20)",
                "allStores()",
                "localStore()",
                "setStoreAllowsEvents(local, true)",
                "ensureWritableCalendarForEntityType(events, local)",
                "saveCalendarDatabase()",
                "log: Merging com.vantor.Dataclass.Reminders to the localstore",
                "log: mergeSyncDataForDataclass",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, none, {RemindersOnly})",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, Quillnet:ada, none)",
                "migrateRecords(Quillnet:ada Calendars, local Calendars {RemindersOnly})",
                "commit(local Calendars {RemindersOnly})",
                "deleteDataSource(local Calendars {RemindersOnly})",
                "commit(Quillnet:ada Calendars)",
                "deleteDataSource(Quillnet:ada Calendars)",
                "log: removeDataStoreForDataclass",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, Quillnet:ada, none)",
                "clearAllRecords(Quillnet:ada Calendars)",
                "commit(Quillnet:ada Calendars)",
                "deleteDataSource(Quillnet:ada Calendars)",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, none, {RemindersOnly})",
                "clearSyncAnchors(local Calendars {RemindersOnly})",
                "deleteDataSource(local Calendars {RemindersOnly})",
                "dataclassNameForSyncType(Calendars)",
                "createDataSource(Calendars, none, {RemindersOnly})",
                "countRecords(local Calendars {RemindersOnly})",
                "deleteDataSource(local Calendars {RemindersOnly})",
                "openCalendarDatabase(20)",
                "allStores()",
                "localStore()",
                "setStoreAllowsReminders(local, true)",
                "ensureWritableCalendarForEntityType(reminders, local)",
                "ensureDefaultCalendarForNewReminders()",
                "saveCalendarDatabase()",
                "log: Checking account <ASSDeviceLocalAccount: DeviceLocalAccount> of type "
                "OnMyDevice",
            }));

  EXPECT_EQ(device.syncDataSource.records(std::nullopt, "Calendars"),
            (Records{{"e", "event", RecordKind::event}, {"r", "reminder", RecordKind::reminder}}));
  EXPECT_EQ(device.syncDataSource.records("cal", "Calendars"), Records{});
  EXPECT_EQ(device.syncDataSource.records("Quillnet:ada", "Calendars"), Records{});
  EXPECT_TRUE(device.calendarStore.storeNamed("local")->allowsEvents);
  EXPECT_TRUE(device.calendarStore.storeNamed("local")->allowsReminders);
  EXPECT_EQ(savedIdentifiers(), Lines{"DeviceLocalAccount"});
  EXPECT_EQ(device.syncDataSource.openSources(), 0);
}

// The account that is about to be retired still counts as one that serves its contacts.
TEST_F(WholeRun, LeavesTheLocalContactsHiddenWhenNothingCameToThem) {
  writeAccounts({selectedInfo("q", {"Contacts"})});
  device.contactsStore.sources = {{"local", false, true}};
  migrator.performMigration();
  EXPECT_EQ(device.contactsStore.calls(), Journal{});
  EXPECT_FALSE(device.contactsStore.isSourceEnabled("local"));
}

TEST_F(WholeRun, FinishesEachOfTwoAccountsBeforeTheNext) {
  writeAccounts({selectedInfo("1", {"Contacts", "Bookmarks"}),
                 with(accountInfo("VantorAccount", "2", {"Notes"}), {{"QuillnetStatus", 1}}),
                 deviceLocalInfo({})});
  device.preferences.applications.clear();
  migrator.performMigration();
  EXPECT_EQ(device.logLines(),
            (Lines{
                "Checking account <ASSBasicAccount: 1> of type Quillnet",
                "Merging com.vantor.Dataclass.Contacts to the localstore",
                "mergeSyncDataForDataclass",
                "Could not merge Name of 1 from com.vantor.Dataclass.Contacts into the local "
                "store. Error: there is no open data source",
                "removeDataStoreForDataclass",
                "Merging com.vantor.Dataclass.Bookmarks to the localstore",
                "createLocalDataSourceForDataclass",
                "Checking account <ASSBasicAccount: 2> of type VantorAccount",
                "Merging com.vantor.Dataclass.Notes to the localstore",
                "mergeSyncDataForDataclass",
                "Could not merge Name of 2 from com.vantor.Dataclass.Notes into the local store. "
                "Error: there is no open data source",
                "removeDataStoreForDataclass",
                "Checking account <ASSDeviceLocalAccount: DeviceLocalAccount> of type OnMyDevice",
            }));
  EXPECT_EQ(savedIdentifiers(), Lines{"DeviceLocalAccount"});
}

}  // namespace
}  // namespace migrator
