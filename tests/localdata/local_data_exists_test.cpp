#include "localdata/DataclassFunctions.h"
#include "platform/testing/ForwardingSyncDataSource.h"
#include "tests/localdata/LocalDataTest.h"

namespace localdata {
namespace {

constexpr const char* kContacts = "com.vantor.Dataclass.Contacts";
constexpr const char* kCalendars = "com.vantor.Dataclass.Calendars";
constexpr const char* kReminders = "com.vantor.Dataclass.Reminders";

class LocalData : public LocalDataTest {
 protected:
  using Sources = platform::InMemorySyncDataSource;
  bool existsOf(std::string_view dataclass) {
    return AccountSettingsDoesLocalDataExistForDataclass(dataclass);
  }
  void putLocalRecord(const std::string& name, Sources::RecordKind kind) {
    device.syncDataSource.stores[{std::nullopt, name}].records.push_back({"1", "one", kind});
  }
};

TEST_F(LocalData, NeverExistsForDataclassesThatDoNotLiveOnTheDeviceAlone) {
  putLocalRecord("MailAccounts", Sources::RecordKind::any);
  for (const char* name :
       {"Mail", "Ubiquity", "KeyValue", "Shoebox", "SharedStreams", "MediaStream"}) {
    SCOPED_TRACE(name);
    EXPECT_FALSE(existsOf(std::string("com.vantor.Dataclass.") + name));
  }
  EXPECT_EQ(device.journal, Journal{});
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalData, ExistsWithoutAWordForADataclassThatIsNotSynced) {
  for (const char* dataclass : {"com.vantor.Dataclass.Backup", "com.vantor.Dataclass.DeviceLocator",
                                "com.vantor.Dataclass.ContactsSearch", "Contacts", ""}) {
    SCOPED_TRACE(dataclass);
    EXPECT_TRUE(existsOf(dataclass));
  }
  EXPECT_EQ(device.journal, Journal{});
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalData, ExistsWithOneRecordAndNotWithNone) {
  EXPECT_FALSE(existsOf(kContacts));
  putLocalRecord("Contacts", Sources::RecordKind::any);
  EXPECT_TRUE(existsOf(kContacts));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalData, IsCountedInTheDeviceLocalSourceWhichIsThenClosedAndKept) {
  putLocalRecord("Contacts", Sources::RecordKind::any);
  existsOf(kContacts);
  EXPECT_EQ(device.journal,
            (Journal{"dataclassNameForSyncType(Contacts)", "createDataSource(Contacts, none, none)",
                     "countRecords(local Contacts)", "deleteDataSource(local Contacts)"}));
  EXPECT_EQ(device.syncDataSource.records(std::nullopt, "Contacts").size(), 1U);
  EXPECT_EQ(device.syncDataSource.openSources(), 0);
}

TEST_F(LocalData, OfCalendarsIsEventsAndOfRemindersReminders) {
  putLocalRecord("Calendars", Sources::RecordKind::reminder);
  EXPECT_FALSE(existsOf(kCalendars));
  EXPECT_TRUE(existsOf(kReminders));
  EXPECT_EQ(device.journal, (Journal{
                                "dataclassNameForSyncType(Calendars)",
                                "createDataSource(Calendars, none, {EventsOnly})",
                                "countRecords(local Calendars {EventsOnly})",
                                "deleteDataSource(local Calendars {EventsOnly})",
                                "dataclassNameForSyncType(Calendars)",
                                "createDataSource(Calendars, none, {RemindersOnly})",
                                "countRecords(local Calendars {RemindersOnly})",
                                "deleteDataSource(local Calendars {RemindersOnly})",
                            }));
}

class OptionKeeper : public platform::ForwardingSyncDataSource {
 public:
  using ForwardingSyncDataSource::ForwardingSyncDataSource;
  Created createDataSource(const std::optional<std::string>& name,
                           const std::optional<std::string>& account,
                           const platform::DataSourceOptions& options) override {
    kept = options;
    return ForwardingSyncDataSource::createDataSource(name, account, options);
  }
  platform::DataSourceOptions kept;
};

TEST_F(LocalData, OptionsHaveTheBooleanTrueAsTheirValue) {
  OptionKeeper sources(device.syncDataSource);
  device.use<platform::SyncDataSource>(sources);
  existsOf(kCalendars);
  EXPECT_EQ(sources.kept, (Dictionary{{"EventsOnly", true}}));
  existsOf(kReminders);
  EXPECT_EQ(sources.kept, (Dictionary{{"RemindersOnly", true}}));
  existsOf(kContacts);
  EXPECT_EQ(sources.kept, std::nullopt);
}

TEST_F(LocalData, ExistsWithoutACountWhenTheSourceCannotBeOpened) {
  device.syncDataSource.failNext("createDataSource", Status::failure(5, "refused"));
  EXPECT_TRUE(existsOf(kContacts));
  EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Contacts)",
                                     "createDataSource(Contacts, none, none)"}));
  EXPECT_EQ(device.logLines(), (Lines{"Error creating data source. Error = refused"}));
}

TEST_F(LocalData, SourceThatCameWithAFailureIsClosedAndNotCounted) {
  device.syncDataSource.answerNext("createDataSource", {Status::failure(5, "half open"), true});
  EXPECT_TRUE(existsOf(kContacts));
  EXPECT_EQ(device.journal,
            (Journal{"dataclassNameForSyncType(Contacts)", "createDataSource(Contacts, none, none)",
                     "deleteDataSource(local Contacts)"}));
  EXPECT_EQ(device.logLines(), (Lines{"Error creating data source. Error = half open"}));
}

TEST_F(LocalData, FailureToOpenWithoutAnErrorIsNotLogged) {
  device.syncDataSource.failNext("createDataSource", Status{5, std::nullopt});
  EXPECT_TRUE(existsOf(kContacts));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalData, ErrorOfASuccessfulOpeningIsLoggedAndTheRecordsDecide) {
  const Status successWithError{0, platform::Error{"a warning"}};
  device.syncDataSource.answerNext("createDataSource", {successWithError, true});
  EXPECT_FALSE(existsOf(kContacts));
  EXPECT_EQ(device.logLines(), (Lines{"Error creating data source. Error = a warning"}));
}

TEST_F(LocalData, DoesNotExistWhenOpeningSucceedsWithoutASource) {
  putLocalRecord("Contacts", Sources::RecordKind::any);
  device.syncDataSource.answerNext("createDataSource", {Status::success(), false});
  EXPECT_FALSE(existsOf(kContacts));
  EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Contacts)",
                                     "createDataSource(Contacts, none, none)"}));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalData, ExistsWhenTheRecordsCannotBeCounted) {
  device.syncDataSource.failNext("countRecords", Status::failure(7, "locked"));
  EXPECT_TRUE(existsOf(kContacts));
  device.syncDataSource.failNext("countRecords", Status{7, std::nullopt});
  EXPECT_TRUE(existsOf(kContacts));
  EXPECT_EQ(device.logLines(),
            (Lines{"Cound not get the count of records in the tethered sync data source. Error = "
                   "locked",
                   "Cound not get the count of records in the tethered sync data source. Error = "
                   "Unknown"}));
  EXPECT_EQ(device.syncDataSource.openSources(), 0);
}

TEST_F(LocalData, FailureToCloseIsLoggedAndChangesNothing) {
  device.syncDataSource.failNext("deleteDataSource", Status::failure(9, "busy"));
  EXPECT_FALSE(existsOf(kContacts));
  putLocalRecord("Contacts", Sources::RecordKind::any);
  device.syncDataSource.failNext("deleteDataSource", Status{9, std::nullopt});
  EXPECT_TRUE(existsOf(kContacts));
  EXPECT_EQ(device.logLines(),
            (Lines{"Cound not delete the tethered sync data source object. Error = busy",
                   "Cound not delete the tethered sync data source object. Error = Unknown"}));
}

}  // namespace
}  // namespace localdata
