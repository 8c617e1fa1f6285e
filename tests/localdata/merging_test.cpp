// Copying the records of one dataclass between the service's store and the device's own.

#include "localdata/AccountSettingsUISyncDataController.h"
#include "tests/localdata/LocalDataTest.h"

namespace localdata {
namespace {

class Merging : public LocalDataTest {
 protected:
  using Sources = platform::InMemorySyncDataSource;
  using Records = std::vector<Sources::Record>;
  Merging() { controller.setSyncAccount(account); }

  // Opening both sources of contacts, the start of every merge of them.
  static Journal openingContacts() {
    return {"dataclassNameForSyncType(Contacts)", "createDataSource(Contacts, none, none)",
            "dataclassNameForSyncType(Contacts)", "createDataSource(Contacts, Quillnet:ada, none)"};
  }
  static Journal joined(Journal first, const Journal& second) {
    first.insert(first.end(), second.begin(), second.end());
    return first;
  }
  std::optional<Value> wereMigrated() const {
    const Value* value = account->properties().find("CalendarsWereMigrated");
    return value != nullptr ? std::optional(*value) : std::nullopt;
  }

  const char* contacts = "com.vantor.Dataclass.Contacts";
  AccountPtr account = record(accountInfo("Quillnet", "q", {"Contacts"}));
  AccountSettingsUISyncDataController controller;
};

const platform::CallJournal kClosingContacts = {
    "commit(local Contacts)", "deleteDataSource(local Contacts)", "commit(Quillnet:ada Contacts)",
    "deleteDataSource(Quillnet:ada Contacts)"};

TEST_F(Merging, SyncDataOpensTheLocalSourceFirstCopiesIntoItAndClosesBoth) {
  device.syncDataSource.stores[{"Quillnet:ada", "Contacts"}].records = {{"1", "one"}, {"2", "two"}};
  controller.mergeSyncDataForDataclass(contacts);
  EXPECT_EQ(
      device.journal,
      joined(joined(openingContacts(), {"migrateRecords(Quillnet:ada Contacts, local Contacts)"}),
             kClosingContacts));
  EXPECT_EQ(device.syncDataSource.records(std::nullopt, "Contacts"),
            (Records{{"1", "one"}, {"2", "two"}}));
  EXPECT_EQ(device.syncDataSource.records("Quillnet:ada", "Contacts"),
            (Records{{"1", "one"}, {"2", "two"}}));
  EXPECT_EQ(device.syncDataSource.openSources(), 0);
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(Merging, LocalDataGoesTheOtherWayInTheSameOrder) {
  device.syncDataSource.stores[{std::nullopt, "Contacts"}].records = {{"1", "one"}};
  controller.mergeLocalDataForDataclass(contacts);
  EXPECT_EQ(
      device.journal,
      joined(joined(openingContacts(), {"migrateRecords(local Contacts, Quillnet:ada Contacts)"}),
             kClosingContacts));
  EXPECT_EQ(device.syncDataSource.records("Quillnet:ada", "Contacts"), (Records{{"1", "one"}}));
  EXPECT_EQ(device.syncDataSource.openSources(), 0);
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(Merging, LoadsNoSettingsForDataclassesOtherThanCalendars) {
  controller.mergeSyncDataForDataclass(contacts);
  controller.mergeLocalDataForDataclass(contacts);
  EXPECT_EQ(settingsReads(), 0U);
}

TEST_F(Merging, FailedMergeIsToldWithTheNameFirstAndBothAreClosedAllTheSame) {
  device.syncDataSource.failNext("migrateRecords", Status::failure(1, "no memory"));
  controller.mergeSyncDataForDataclass(contacts);
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not merge Name of q from com.vantor.Dataclass.Contacts "
                   "into the local store. Error: no memory"}));
  EXPECT_EQ(Journal(device.journal.end() - 4, device.journal.end()), kClosingContacts);
}

TEST_F(Merging, FailedMergeOfLocalDataIsToldWithTheDataclassFirst) {
  device.syncDataSource.failNext("migrateRecords", Status::failure(1, "no memory"));
  controller.mergeLocalDataForDataclass(contacts);
  EXPECT_EQ(device.logLines(), (Lines{"Could not merge local com.vantor.Dataclass.Contacts into "
                                      "Name of q. Error: no memory"}));
  EXPECT_EQ(Journal(device.journal.end() - 4, device.journal.end()), kClosingContacts);
}

TEST_F(Merging, EachClosingStepIsTakenWhateverFailedBeforeAndToldInItsOwnWords) {
  device.syncDataSource.failNext("migrateRecords", Status::failure(1, "e1"));
  device.syncDataSource.failNext("commit(local", Status::failure(1, "e2"));
  device.syncDataSource.failNext("deleteDataSource(local", Status::failure(1, "e3"));
  device.syncDataSource.failNext("commit(Quillnet", Status::failure(1, "e4"));
  device.syncDataSource.failNext("deleteDataSource(Quillnet", Status{1, std::nullopt});
  controller.mergeSyncDataForDataclass(contacts);
  EXPECT_EQ(Journal(device.journal.end() - 4, device.journal.end()), kClosingContacts);
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not merge Name of q from com.vantor.Dataclass.Contacts into the local "
                   "store. Error: e1",
                   "Could not commit tethered sync data source. Error: e2",
                   "Could not delete tethered sync data source. Error: e3",
                   "Could not commit ota sync data source. Error: e4",
                   "Could not delete ota data source (ASSBasicAccount). Error: (null)"}));
}

TEST_F(Merging, LocalDataClosesInTheSameWords) {
  device.syncDataSource.failEvery("commit", Status::failure(1, "e1"));
  device.syncDataSource.failEvery("deleteDataSource", Status::failure(1, "e2"));
  controller.mergeLocalDataForDataclass(contacts);
  EXPECT_EQ(device.logLines(), (Lines{"Could not commit tethered sync data source. Error: e1",
                                      "Could not delete tethered sync data source. Error: e2",
                                      "Could not commit ota sync data source. Error: e1",
                                      "Could not delete ota data source (ASSBasicAccount). "
                                      "Error: e2"}));
}

TEST_F(Merging, IsTriedWithAMissingSourceWhichIsThenNotClosed) {
  struct Row {
    const char* failing;
    const char* merge;
    Journal closing;
  };
  const Row kRows[] = {
      {"createDataSource(Contacts, none",
       "migrateRecords(Quillnet:ada Contacts, none)",
       {"commit(Quillnet:ada Contacts)", "deleteDataSource(Quillnet:ada Contacts)"}},
      {"createDataSource(Contacts, Quillnet",
       "migrateRecords(none, local Contacts)",
       {"commit(local Contacts)", "deleteDataSource(local Contacts)"}},
      {"createDataSource", "migrateRecords(none, none)", {}},
  };
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.failing);
    device.journal.clear();
    device.syncDataSource.answerNormally();
    device.syncDataSource.failEvery(row.failing);
    controller.mergeSyncDataForDataclass(contacts);
    EXPECT_EQ(device.journal, joined(joined(openingContacts(), {row.merge}), row.closing));
  }
}

TEST_F(Merging, LocalDataIsTriedWithAMissingSourceToo) {
  device.syncDataSource.failEvery("createDataSource(Contacts, Quillnet");
  controller.mergeLocalDataForDataclass(contacts);
  EXPECT_EQ(device.journal, joined(openingContacts(),
                                   {"migrateRecords(local Contacts, none)",
                                    "commit(local Contacts)", "deleteDataSource(local Contacts)"}));
}

TEST_F(Merging, WithoutAnAccountNameRunsWithAMissingSourceAndTellsWhatThePlatformSays) {
  setSyncAgentAccountName(7);
  controller.mergeSyncDataForDataclass(contacts);
  EXPECT_EQ(device.journal,
            (Journal{"dataclassNameForSyncType(Contacts)", "createDataSource(Contacts, none, none)",
                     "migrateRecords(none, local Contacts)", "commit(local Contacts)",
                     "deleteDataSource(local Contacts)"}));
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not merge Name of q from com.vantor.Dataclass.Contacts "
                   "into the local store. Error: there is no open data source"}));
}

TEST_F(Merging, NameInTheLinesIsTheDisplayNameInheritedOrNone) {
  device.syncDataSource.failEvery("migrateRecords", Status::failure(1, "e"));
  Dictionary nameless = accountInfo("CalDAV", "child", {});
  nameless.remove("DisplayName");
  const AccountPtr child = record(nameless);
  controller.setSyncAccount(child);
  controller.mergeSyncDataForDataclass(contacts);
  child->setParentAccount(account);
  controller.mergeLocalDataForDataclass(contacts);
  EXPECT_EQ(device.logLines(), (Lines{"Could not merge (null) from com.vantor.Dataclass.Contacts "
                                      "into the local store. Error: e",
                                      "Could not merge local com.vantor.Dataclass.Contacts into "
                                      "Name of q. Error: e"}));
}

TEST_F(Merging, LocalCalendarsOrRemindersMarkTheAccountWhichIsNotSaved) {
  for (const char* name : {"Calendars", "Reminders"}) {
    SCOPED_TRACE(name);
    account->removeAccountPropertyForKey("CalendarsWereMigrated");
    controller.mergeLocalDataForDataclass(std::string("com.vantor.Dataclass.") + name);
    EXPECT_EQ(wereMigrated(), Value(true));
  }
  EXPECT_EQ(device.readSettingsBytes(), std::nullopt);
}

TEST_F(Merging, NothingElseMarksTheAccount) {
  controller.mergeLocalDataForDataclass(contacts);
  controller.mergeSyncDataForDataclass("com.vantor.Dataclass.Calendars");
  controller.mergeSyncDataForDataclass("com.vantor.Dataclass.Reminders");
  device.syncDataSource.failEvery("migrateRecords");
  controller.mergeLocalDataForDataclass("com.vantor.Dataclass.Calendars");
  controller.mergeLocalDataForDataclass("com.vantor.Dataclass.Reminders");
  EXPECT_EQ(wereMigrated(), std::nullopt);
}

TEST_F(Merging, AccountIsMarkedBeforeTheSourcesAreClosed) {
  std::optional<Value> atTheCommit;
  device.syncDataSource.decideBy([&](const std::string& call) {
    if (call.starts_with("commit(local")) atTheCommit = wereMigrated();
    return std::optional<platform::PlannedAnswer>();
  });
  controller.mergeLocalDataForDataclass("com.vantor.Dataclass.Calendars");
  EXPECT_EQ(atTheCommit, Value(true));
}

TEST_F(Merging, CalendarsTakeEventsAndRemindersTakeRemindersIntoTheirOwnSources) {
  device.syncDataSource.stores[{"Quillnet:ada", "Calendars"}].records = {
      {"e", "event", Sources::RecordKind::event}, {"r", "reminder", Sources::RecordKind::reminder}};
  controller.mergeSyncDataForDataclass("com.vantor.Dataclass.Calendars");
  EXPECT_EQ(device.syncDataSource.records(std::nullopt, "Calendars").size(), 1U);
  controller.mergeSyncDataForDataclass("com.vantor.Dataclass.Reminders");
  EXPECT_EQ(device.syncDataSource.records(std::nullopt, "Calendars").size(), 2U);
  EXPECT_EQ(
      device.journal,
      (Journal{
          "dataclassNameForSyncType(Calendars)", "createDataSource(Calendars, none, {EventsOnly})",
          "dataclassNameForSyncType(Calendars)",
          "createDataSource(Calendars, Quillnet:ada, {EventsOnly})",
          "countRecords(Quillnet:ada Calendars {EventsOnly})",
          "migrateRecords(Quillnet:ada Calendars {EventsOnly}, local Calendars "
          "{EventsOnly})",
          "commit(local Calendars {EventsOnly})", "deleteDataSource(local Calendars {EventsOnly})",
          "commit(Quillnet:ada Calendars {EventsOnly})",
          "deleteDataSource(Quillnet:ada Calendars {EventsOnly})",
          "dataclassNameForSyncType(Calendars)",
          "createDataSource(Calendars, none, {RemindersOnly})",
          "dataclassNameForSyncType(Calendars)", "createDataSource(Calendars, Quillnet:ada, none)",
          "migrateRecords(Quillnet:ada Calendars, local Calendars {RemindersOnly})",
          "commit(local Calendars {RemindersOnly})",
          "deleteDataSource(local Calendars {RemindersOnly})", "commit(Quillnet:ada Calendars)",
          "deleteDataSource(Quillnet:ada Calendars)"}));
}

}  // namespace
}  // namespace localdata
