// Emptying and removing the service's store and the device-local one.

#include "localdata/AccountSettingsUISyncDataController.h"
#include "tests/localdata/LocalDataTest.h"

namespace localdata {
namespace {

using RecordKind = platform::InMemorySyncDataSource::RecordKind;

constexpr const char* kContacts = "com.vantor.Dataclass.Contacts";
constexpr const char* kCalendars = "com.vantor.Dataclass.Calendars";
constexpr const char* kReminders = "com.vantor.Dataclass.Reminders";

class RemovingStores : public LocalDataTest {
 protected:
  RemovingStores() { setUpAccountWith({"Contacts"}); }
  void setUpAccountWith(const std::vector<std::string>& enabled) {
    controller.setSyncAccount(record(accountInfo("Quillnet", "q", enabled)));
  }
  // The journal from the first call that works on an open source.
  Journal workOnSources() const {
    Journal work;
    for (const std::string& call : device.journal)
      if (!call.starts_with("dataclassNameForSyncType") && !call.starts_with("createDataSource") &&
          !call.starts_with("countRecords"))
        work.push_back(call);
    return work;
  }
  std::vector<std::string> localEnabled() {
    return controller.deviceLocalAccount()->enabledDataclasses().value_or(
        std::vector<std::string>());
  }
  AccountSettingsUISyncDataController controller;
};

using RemovingTheServiceStore = RemovingStores;
using RemovingTheLocalStore = RemovingStores;

TEST_F(RemovingTheServiceStore, RemovesCommitsAndCloses) {
  device.syncDataSource.stores[{"Quillnet:ada", "Contacts"}].records = {{"1", "one"}};
  controller.removeDataStoreForDataclass(kContacts);
  EXPECT_EQ(device.journal,
            (Journal{"dataclassNameForSyncType(Contacts)",
                     "createDataSource(Contacts, Quillnet:ada, none)",
                     "removeStore(Quillnet:ada Contacts, false)", "commit(Quillnet:ada Contacts)",
                     "deleteDataSource(Quillnet:ada Contacts)"}));
  EXPECT_FALSE(device.syncDataSource.storeExists("Quillnet:ada", "Contacts"));
  EXPECT_EQ(device.syncDataSource.openSources(), 0);
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(RemovingTheServiceStore, DoesNothingWithoutAnAccountName) {
  setSyncAgentAccountName(5);
  for (const char* dataclass : {kContacts, kCalendars, kReminders})
    controller.removeDataStoreForDataclass(dataclass);
  EXPECT_EQ(device.journal, Journal{});
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(RemovingTheServiceStore, DoesNothingMoreWithoutASource) {
  device.syncDataSource.failNext("createDataSource", Status::failure(1, "refused"));
  controller.removeDataStoreForDataclass(kContacts);
  EXPECT_EQ(workOnSources(), Journal{});
  EXPECT_EQ(
      device.logLines(),
      (Lines{"Could not create the datasource for the dataclass com.vantor.Dataclass.Contacts "
             "of the Device Local Account. Error refused"}));
}

TEST_F(RemovingTheServiceStore, WorksOnASourceThatCameWithAFailure) {
  device.syncDataSource.answerNext("createDataSource", {Status::failure(1, "half open"), true});
  controller.removeDataStoreForDataclass(kContacts);
  EXPECT_EQ(workOnSources(),
            (Journal{"removeStore(Quillnet:ada Contacts, false)", "commit(Quillnet:ada Contacts)",
                     "deleteDataSource(Quillnet:ada Contacts)"}));
}

TEST_F(RemovingTheServiceStore, EmptiesCalendarsAndRemovesThemOnlyWithoutReminders) {
  const Journal emptied = {"clearAllRecords(Quillnet:ada Calendars {EventsOnly})",
                           "commit(Quillnet:ada Calendars {EventsOnly})",
                           "deleteDataSource(Quillnet:ada Calendars {EventsOnly})"};
  const Journal removed = {"clearAllRecords(Quillnet:ada Calendars {EventsOnly})",
                           "removeStore(Quillnet:ada Calendars {EventsOnly}, false)",
                           "commit(Quillnet:ada Calendars {EventsOnly})",
                           "deleteDataSource(Quillnet:ada Calendars {EventsOnly})"};
  setUpAccountWith({"Calendars", "Reminders"});
  controller.removeDataStoreForDataclass(kCalendars);
  EXPECT_EQ(workOnSources(), emptied);
  device.journal.clear();
  setUpAccountWith({"Calendars", "Contacts"});
  controller.removeDataStoreForDataclass(kCalendars);
  EXPECT_EQ(workOnSources(), removed);
}

TEST_F(RemovingTheServiceStore, EmptiesRemindersAndRemovesThemOnlyWithoutCalendars) {
  setUpAccountWith({"Calendars", "Reminders"});
  controller.removeDataStoreForDataclass(kReminders);
  EXPECT_EQ(workOnSources(),
            (Journal{"clearAllRecords(Quillnet:ada Calendars)", "commit(Quillnet:ada Calendars)",
                     "deleteDataSource(Quillnet:ada Calendars)"}));
  device.journal.clear();
  setUpAccountWith({"Reminders"});
  controller.removeDataStoreForDataclass(kReminders);
  EXPECT_EQ(workOnSources(),
            (Journal{"clearAllRecords(Quillnet:ada Calendars)",
                     "removeStore(Quillnet:ada Calendars, false)", "commit(Quillnet:ada Calendars)",
                     "deleteDataSource(Quillnet:ada Calendars)"}));
}

TEST_F(RemovingTheServiceStore, KeepsTheCalendarStoreWhenBothDataclassesWereHandled) {
  setUpAccountWith({"Calendars", "Reminders"});
  device.syncDataSource.stores[{"Quillnet:ada", "Calendars"}].records = {
      {"e", "event", RecordKind::event}, {"r", "reminder", RecordKind::reminder}};
  controller.removeDataStoreForDataclass(kCalendars);
  EXPECT_EQ(device.syncDataSource.records("Quillnet:ada", "Calendars").size(), 1U);
  controller.removeDataStoreForDataclass(kReminders);
  EXPECT_TRUE(device.syncDataSource.storeExists("Quillnet:ada", "Calendars"));
  EXPECT_EQ(device.syncDataSource.records("Quillnet:ada", "Calendars").size(), 0U);
}

TEST_F(RemovingTheServiceStore, FailureIsToldAndNothingIsCommitted) {
  device.syncDataSource.failNext("removeStore", Status::failure(1, "in use"));
  controller.removeDataStoreForDataclass(kContacts);
  EXPECT_EQ(workOnSources(), (Journal{"removeStore(Quillnet:ada Contacts, false)",
                                      "deleteDataSource(Quillnet:ada Contacts)"}));
  EXPECT_EQ(
      device.logLines(),
      (Lines{"Could not delete the datasource for the dataclass com.vantor.Dataclass.Contacts "
             "of the Device Local Account. Error in use"}));
}

TEST_F(RemovingTheServiceStore, FailureToEmptyIsToldAndTheStoreIsRemovedAllTheSame) {
  setUpAccountWith({"Calendars"});
  device.syncDataSource.failNext("clearAllRecords", Status::failure(1, "locked"));
  controller.removeDataStoreForDataclass(kCalendars);
  EXPECT_EQ(workOnSources(), (Journal{"clearAllRecords(Quillnet:ada Calendars {EventsOnly})",
                                      "removeStore(Quillnet:ada Calendars {EventsOnly}, false)",
                                      "deleteDataSource(Quillnet:ada Calendars {EventsOnly})"}));
  EXPECT_EQ(
      device.logLines(),
      (Lines{"Could not delete the datasource for the dataclass com.vantor.Dataclass.Calendars "
             "of the Device Local Account. Error locked"}));
}

TEST_F(RemovingTheServiceStore, WhetherAnEmptiedStoreWasRemovedDoesNotMatter) {
  setUpAccountWith({"Calendars"});
  device.syncDataSource.failNext("removeStore", Status::failure(1, "in use"));
  controller.removeDataStoreForDataclass(kCalendars);
  EXPECT_EQ(workOnSources(), (Journal{"clearAllRecords(Quillnet:ada Calendars {EventsOnly})",
                                      "removeStore(Quillnet:ada Calendars {EventsOnly}, false)",
                                      "commit(Quillnet:ada Calendars {EventsOnly})",
                                      "deleteDataSource(Quillnet:ada Calendars {EventsOnly})"}));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(RemovingTheServiceStore, FailuresToCommitAndToCloseAreTold) {
  device.syncDataSource.failNext("commit", Status::failure(1, "disk full"));
  device.syncDataSource.failNext("deleteDataSource", Status::failure(1, "busy"));
  controller.removeDataStoreForDataclass(kContacts);
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not commit the changes to the datasource for the dataclass "
                   "com.vantor.Dataclass.Contacts of the Device Local Account. Error disk full",
                   "Could not delete ota data source (ASSBasicAccount). Error: busy"}));
}

TEST_F(RemovingTheLocalStore, TurnsADataclassOffAndRemovesItsStore) {
  writeAccounts({deviceLocalInfo({"Contacts", "Notes"})});
  EXPECT_EQ(controller.shouldSaveDeviceLocalAccount(), false);
  controller.removeLocalDataStoreForDataclass(kContacts);
  EXPECT_EQ(device.journal,
            (Journal{"setTetheredSyncingDisabled(Contacts, true)",
                     "dataclassNameForSyncType(Contacts)", "createDataSource(Contacts, none, none)",
                     "removeStore(local Contacts, false)", "deleteDataSource(local Contacts)"}));
  EXPECT_EQ(localEnabled(), (std::vector<std::string>{"com.vantor.Dataclass.Notes"}));
  EXPECT_TRUE(controller.shouldSaveDeviceLocalAccount());
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(RemovingTheLocalStore, MarksTheAccountForSavingAlsoWhenItCouldNotBeTurnedOff) {
  writeAccounts({deviceLocalInfo({"Contacts"})});
  device.syncDataSource.failEvery("setTethered");
  controller.removeLocalDataStoreForDataclass(kContacts);
  EXPECT_EQ(localEnabled(), (std::vector<std::string>{"com.vantor.Dataclass.Contacts"}));
  EXPECT_TRUE(controller.shouldSaveDeviceLocalAccount());
  EXPECT_EQ(workOnSources(),
            (Journal{"setTetheredSyncingDisabled(Contacts, true)",
                     "removeStore(local Contacts, false)", "deleteDataSource(local Contacts)"}));
}

TEST_F(RemovingTheLocalStore, EmptiesAndHidesCalendarsAndLeavesTheAccountAlone) {
  writeAccounts({deviceLocalInfo({"Calendars", "Reminders"})});
  controller.removeLocalDataStoreForDataclass(kCalendars);
  EXPECT_EQ(
      device.journal,
      (Journal{
          "dataclassNameForSyncType(Calendars)", "createDataSource(Calendars, none, {EventsOnly})",
          "clearAllRecords(local Calendars {EventsOnly})", "commit(local Calendars {EventsOnly})",
          "deleteDataSource(local Calendars {EventsOnly})", "openCalendarDatabase(20)",
          "allStores()", "localStore()", "setStoreAllowsEvents(local, false)",
          "ensureWritableCalendarForEntityType(events, local)", "saveCalendarDatabase()"}));
  EXPECT_EQ(localEnabled(), (std::vector<std::string>{"com.vantor.Dataclass.Calendars",
                                                      "com.vantor.Dataclass.Reminders"}));
  EXPECT_FALSE(controller.shouldSaveDeviceLocalAccount());
}

TEST_F(RemovingTheLocalStore, EmptiesAndHidesReminders) {
  writeAccounts({deviceLocalInfo({})});
  controller.removeLocalDataStoreForDataclass(kReminders);
  EXPECT_EQ(
      device.journal,
      (Journal{"dataclassNameForSyncType(Calendars)",
               "createDataSource(Calendars, none, {RemindersOnly})",
               "clearAllRecords(local Calendars {RemindersOnly})",
               "commit(local Calendars {RemindersOnly})",
               "deleteDataSource(local Calendars {RemindersOnly})", "openCalendarDatabase(20)",
               "allStores()", "localStore()", "setStoreAllowsReminders(local, false)",
               "ensureWritableCalendarForEntityType(reminders, local)",
               "ensureDefaultCalendarForNewReminders()", "saveCalendarDatabase()"}));
}

TEST_F(RemovingTheLocalStore, UsesAMissingSourceAndTellsWhatThePlatformSays) {
  writeAccounts({deviceLocalInfo({})});
  device.syncDataSource.failNext("createDataSource", Status::failure(1, "refused"));
  controller.removeLocalDataStoreForDataclass(kCalendars);
  EXPECT_EQ(Journal(device.journal.begin() + 2, device.journal.begin() + 5),
            (Journal{"clearAllRecords(none)", "commit(none)", "deleteDataSource(none)"}));
  EXPECT_EQ(
      device.logLines(),
      (Lines{"Could not create the datasource for the dataclass com.vantor.Dataclass.Calendars of "
             "the Device Local Account. Error refused",
             "Could not commit the changes to the datasource for the dataclass "
             "com.vantor.Dataclass.Calendars of the Device Local Account. Error there is no open "
             "data source",
             "Could not delete ota data source (ASSBasicAccount). Error: there is no open data "
             "source"}));
  EXPECT_FALSE(device.calendarStore.storeNamed("local")->allowsEvents);
}

TEST_F(RemovingTheLocalStore, FailureToEmptyIsNotToldAndTheRestFollows) {
  writeAccounts({deviceLocalInfo({})});
  device.syncDataSource.failNext("clearAllRecords");
  controller.removeLocalDataStoreForDataclass(kCalendars);
  EXPECT_EQ(workOnSources()[1], "commit(local Calendars {EventsOnly})");
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(RemovingTheLocalStore, NamesNoClassWithoutASyncAccount) {
  writeAccounts({deviceLocalInfo({})});
  controller.setSyncAccount(nullptr);
  device.syncDataSource.failEvery("deleteDataSource", Status::failure(1, "busy"));
  controller.removeLocalDataStoreForDataclass(kCalendars);
  EXPECT_EQ(device.logLines(), (Lines{"Could not delete ota data source ((null)). Error: busy"}));
}

}  // namespace
}  // namespace localdata
