// Merging and removing one account.

#include "tests/migrator/MigratorTest.h"

namespace migrator {
namespace {

class Retiring : public MigratorTest {
 protected:
  bool merge(const Dictionary& info) {
    return migrator._mergeAccountDataToLocalStore(record(info));
  }
  std::ptrdiff_t countOf(std::string_view call) const {
    return std::count_if(device.journal.begin(), device.journal.end(),
                         [&](const std::string& line) { return line.starts_with(call); });
  }
  // Only the lines of the system log.
  Lines lines() const { return device.logLines(); }
};

TEST_F(Retiring, MergesThenRemovesTheStoreOfADataclassWithSeveralStores) {
  EXPECT_TRUE(merge(selectedInfo("q", {"Notes"})));
  EXPECT_EQ(device.journal, (Journal{
                                "log: Merging com.vantor.Dataclass.Notes to the localstore",
                                "log: mergeSyncDataForDataclass",
                                "dataclassNameForSyncType(Notes)",
                                "createDataSource(Notes, none, none)",
                                "dataclassNameForSyncType(Notes)",
                                "createDataSource(Notes, Quillnet:ada, none)",
                                "migrateRecords(Quillnet:ada Notes, local Notes)",
                                "commit(local Notes)",
                                "deleteDataSource(local Notes)",
                                "commit(Quillnet:ada Notes)",
                                "deleteDataSource(Quillnet:ada Notes)",
                                "log: removeDataStoreForDataclass",
                                "dataclassNameForSyncType(Notes)",
                                "createDataSource(Notes, Quillnet:ada, none)",
                                "removeStore(Quillnet:ada Notes, false)",
                                "commit(Quillnet:ada Notes)",
                                "deleteDataSource(Quillnet:ada Notes)",
                                "dataclassNameForSyncType(Notes)",
                                "createDataSource(Notes, none, none)",
                                "clearSyncAnchors(local Notes)",
                                "deleteDataSource(local Notes)",
                                "log: DeviceLocalAccount missing. Creating...",
                            }));
}

TEST_F(Retiring, OnlyMakesALocalSourceForADataclassWithOneStore) {
  EXPECT_TRUE(merge(selectedInfo("q", {"Bookmarks"})));
  EXPECT_EQ(device.journal, (Journal{
                                "log: Merging com.vantor.Dataclass.Bookmarks to the localstore",
                                "log: createLocalDataSourceForDataclass",
                                "log: DeviceLocalAccount missing. Creating...",
                                "setTetheredSyncingDisabled(Bookmarks, false)",
                                "dataclassNameForSyncType(Bookmarks)",
                                "createDataSource(Bookmarks, none, none)",
                                "commit(local Bookmarks)",
                                "deleteDataSource(local Bookmarks)",
                                "dataclassNameForSyncType(Bookmarks)",
                                "createDataSource(Bookmarks, none, none)",
                                "clearSyncAnchors(local Bookmarks)",
                                "deleteDataSource(local Bookmarks)",
                            }));
}

TEST_F(Retiring, ShowsTheLocalStoreLastOfAll) {
  writeAccounts({deviceLocalInfo({})});
  merge(selectedInfo("q", {"Reminders"}));
  EXPECT_EQ(Journal(device.journal.end() - 9, device.journal.end()),
            (Journal{
                "clearSyncAnchors(local Calendars {RemindersOnly})",
                "deleteDataSource(local Calendars {RemindersOnly})",
                "openCalendarDatabase(20)",
                "allStores()",
                "localStore()",
                "setStoreAllowsReminders(local, true)",
                "ensureWritableCalendarForEntityType(reminders, local)",
                "ensureDefaultCalendarForNewReminders()",
                "saveCalendarDatabase()",
            }));
}

TEST_F(Retiring, HandlesEnabledDataclassesInTheListedOrder) {
  writeAccounts({deviceLocalInfo({})});
  Dictionary info = selectedInfo("q", {"Unknown", "Bookmarks", "Notes", "Contacts", "Mail"});
  info.set("Provisioned Dataclasses", dataclasses({"Contacts", "Bookmarks", "Mail", "Unknown"}));
  EXPECT_TRUE(merge(info));
  EXPECT_EQ(lines(), (Lines{"Merging com.vantor.Dataclass.Mail to the localstore",
                            "createLocalDataSourceForDataclass",
                            "Merging com.vantor.Dataclass.Contacts to the localstore",
                            "mergeSyncDataForDataclass", "removeDataStoreForDataclass",
                            "Merging com.vantor.Dataclass.Bookmarks to the localstore",
                            "createLocalDataSourceForDataclass"}));
}

TEST_F(Retiring, DoesNothingWithoutEnabledDataclasses) {
  EXPECT_TRUE(merge(selectedInfo("empty list", {})));
  Dictionary info = selectedInfo("no list", {});
  info.remove("Enabled Dataclasses");
  EXPECT_TRUE(merge(info));
  EXPECT_EQ(device.journal, Journal{});
  EXPECT_EQ(settingsReads(), 0U);
}

TEST_F(Retiring, RemovesAccountsWithoutEnabledDataclassesFromTheFile) {
  Dictionary noList = selectedInfo("no list", {});
  noList.remove("Enabled Dataclasses");
  writeAccounts({selectedInfo("empty list", {}), noList, accountInfo("Mail", "m", {})});
  migrator.performMigration();
  EXPECT_EQ(savedIdentifiers(), Lines{"m"});
  EXPECT_EQ(lines(), (Lines{"Checking account <ASSBasicAccount: empty list> of type Quillnet",
                            "Checking account <ASSBasicAccount: no list> of type Quillnet",
                            "Checking account <ASSBasicAccount: m> of type Mail"}));
}

TEST_F(Retiring, GoesOnWhateverFailsAndRemovesTheStoreAfterAFailedMerge) {
  writeAccounts({deviceLocalInfo({})});
  device.syncDataSource.failEvery("migrateRecords", Status::failure(1, "no memory"));
  EXPECT_TRUE(merge(selectedInfo("q", {"Contacts", "Notes"})));
  EXPECT_EQ(countOf("removeStore(Quillnet:ada Contacts"), 1);
  EXPECT_EQ(countOf("removeStore(Quillnet:ada Notes"), 1);
  EXPECT_EQ(
      lines(),
      (Lines{"Merging com.vantor.Dataclass.Contacts to the localstore", "mergeSyncDataForDataclass",
             "Could not merge Name of q from com.vantor.Dataclass.Contacts into the "
             "local store. Error: no memory",
             "removeDataStoreForDataclass", "Merging com.vantor.Dataclass.Notes to the localstore",
             "mergeSyncDataForDataclass",
             "Could not merge Name of q from com.vantor.Dataclass.Notes into the "
             "local store. Error: no memory",
             "removeDataStoreForDataclass"}));
}

TEST_F(Retiring, AnswersTrueAndRemovesTheAccountWhenEveryCallFails) {
  writeAccounts({selectedInfo("q", {"Contacts", "Calendars", "Reminders", "Bookmarks", "Notes"}),
                 accountInfo("Mail", "m", {"Mail"})});
  device.syncDataSource.failEvery("");
  device.contactsStore.failEvery("");
  device.calendarStore.failEvery("");
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(savedIdentifiers(), Lines{"m"});
}

TEST_F(Retiring, LeavesTheStoredDeviceLocalAccountAsItIs) {
  writeAccounts({selectedInfo("q", {"Bookmarks"}), deviceLocalInfo({"Notes"})});
  migrator.performMigration();
  EXPECT_EQ(savedIdentifiers(), Lines{"DeviceLocalAccount"});
  EXPECT_EQ(savedProperty("OnMyDevice", "Enabled Dataclasses"), Value(dataclasses({"Notes"})));
}

TEST_F(Retiring, AddsNoDeviceLocalAccountToTheFile) {
  writeAccounts({selectedInfo("q", {"Bookmarks"})});
  migrator.performMigration();
  EXPECT_EQ(savedIdentifiers(), Lines{});
}

TEST_F(Retiring, MakesOneDeviceLocalAccountForEachAccount) {
  writeAccounts({selectedInfo("1", {"Bookmarks", "Notes"}), selectedInfo("2", {"Bookmarks"})});
  migrator.performMigration();
  EXPECT_EQ(countOf("log: DeviceLocalAccount missing. Creating..."), 2);
}

TEST_F(Retiring, TakesADataclassThatIsNotSyncedThroughEachStep) {
  writeAccounts({deviceLocalInfo({})});
  EXPECT_TRUE(merge(selectedInfo("q", {"Backup"})));
  const char* couldNotCreate =
      "log: Could not create the datasource for the dataclass com.vantor.Dataclass.Backup of the "
      "Device Local Account. Error there is no dataclass";
  EXPECT_EQ(device.journal, (Journal{
                                "log: Merging com.vantor.Dataclass.Backup to the localstore",
                                "log: createLocalDataSourceForDataclass",
                                "createDataSource(none, none, none)",
                                couldNotCreate,
                                "createDataSource(none, none, none)",
                                couldNotCreate,
                            }));
}

TEST_F(Retiring, TakesADataclassThatIsNotSyncedThroughTheMergeToo) {
  useAccountTypes({{"Quillnet", Dictionary{{"Supported Dataclasses", dataclasses({"Backup"})}}},
                   {"OnMyDevice", Dictionary()}});
  writeResource("DataclassesProperties",
                {{"com.vantor.Dataclass.Backup", Dictionary{{"Supports Multiple Stores", true}}}});
  writeAccounts({deviceLocalInfo({})});
  EXPECT_TRUE(merge(selectedInfo("q", {"Backup"})));
  const char* couldNotCreate =
      "log: Could not create the datasource for the dataclass com.vantor.Dataclass.Backup of the "
      "Device Local Account. Error there is no dataclass";
  EXPECT_EQ(device.journal, (Journal{
                                "log: Merging com.vantor.Dataclass.Backup to the localstore",
                                "log: mergeSyncDataForDataclass",
                                "createDataSource(none, none, none)",
                                couldNotCreate,
                                "createDataSource(none, Quillnet:ada, none)",
                                couldNotCreate,
                                "migrateRecords(none, none)",
                                "log: Could not merge Name of q from com.vantor.Dataclass.Backup "
                                "into the local store. Error: there is no open data source",
                                "log: removeDataStoreForDataclass",
                                "createDataSource(none, Quillnet:ada, none)",
                                couldNotCreate,
                                "createDataSource(none, none, none)",
                                couldNotCreate,
                            }));
}

class RemovingAnAccount : public Retiring {
 protected:
  // Runs over one selected account; the callers look at what the removal did.
  void run() {
    writeAccounts({selectedInfo("q", {}), accountInfo("Mail", "m", {})});
    EXPECT_TRUE(migrator.performMigration());
  }
};

TEST_F(RemovingAnAccount, SavesOncePerAccount) {
  device.fileServices.alsoNoteCallsIn(&device.journal);
  writeAccounts({selectedInfo("1", {}), selectedInfo("2", {}), accountInfo("Mail", "m", {})});
  migrator.performMigration();
  EXPECT_EQ(countOf("renameFileToFile"), 2);
}

TEST_F(RemovingAnAccount, FailedSaveLeavesItInTheFileAndNotInTheStore) {
  device.fileServices.failEvery("renameFileToFile");
  run();
  EXPECT_EQ(savedIdentifiers(), (Lines{"q", "m"}));
  EXPECT_EQ(migrator.manager()->accountWithIdentifier("q"), nullptr);
  EXPECT_EQ(device.temporaryFiles(), Lines{});
}

TEST_F(RemovingAnAccount, AnswersTrueAlsoWhenTheSaveFailed) {
  run();
  const AccountPtr left = migrator.manager()->accountWithIdentifier("m");
  device.userDatabase.groups.clear();
  EXPECT_TRUE(migrator._removeAccount(left));
  EXPECT_EQ(migrator.manager()->count(), 0U);
  EXPECT_EQ(savedIdentifiers(), Lines{"m"});
}

TEST_F(RemovingAnAccount, TakesOverWhatAnotherProcessChangedMeanwhile) {
  writeAccounts({selectedInfo("q", {}), accountInfo("Mail", "m", {})});
  log.listener = [&](std::string_view line) {
    if (line == "Checking account <ASSBasicAccount: q> of type Quillnet")
      writeAccounts({selectedInfo("q", {}),
                     with(accountInfo("Mail", "m", {}), {{"DisplayName", "Renamed"}})});
  };
  migrator.performMigration();
  EXPECT_EQ(savedIdentifiers(), Lines{"m"});
  EXPECT_EQ(savedProperty("Mail", "DisplayName"), Value("Renamed"));
}

}  // namespace
}  // namespace migrator
