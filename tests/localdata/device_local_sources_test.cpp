// The device-local account and the sources behind it: opening, turning on and off, deleting.

#include "QuillnetAccountTypeRemoval/ASSDeviceLocalAccount.h"
#include "platform/testing/ForwardingSyncDataSource.h"
#include "tests/localdata/LocalDataTest.h"

namespace localdata {
namespace {

using accountsettings::ASSDeviceLocalAccount;
using accountsettings::DeviceLocalAccountPtr;
using platform::DataSourceOptions;
using platform::DataSourcePtr;

constexpr const char* kContacts = "com.vantor.Dataclass.Contacts";
constexpr const char* kCalendars = "com.vantor.Dataclass.Calendars";
constexpr const char* kReminders = "com.vantor.Dataclass.Reminders";
constexpr const char* kBackup = "com.vantor.Dataclass.Backup";
constexpr const char* kMail = "com.vantor.Dataclass.Mail";

// Makes the protected operations reachable.
class OpenedUpAccount : public ASSDeviceLocalAccount {
 public:
  using ASSDeviceLocalAccount::_deleteDataSourceForDataclass;
  using ASSDeviceLocalAccount::_saveChangesToOnMyDeviceAccount;
  using ASSDeviceLocalAccount::_setTetheredDataSourceEnabledForDataclass;
  using ASSDeviceLocalAccount::ASSDeviceLocalAccount;
  static std::shared_ptr<OpenedUpAccount> make(const Dictionary& info) {
    return _recordWithProperties<OpenedUpAccount>(info);
  }
};

class DeviceLocalAccount : public LocalDataTest {
 protected:
  std::shared_ptr<OpenedUpAccount> account = OpenedUpAccount::make(deviceLocalInfo({"Notes"}));

  Array enabled() const {
    const Array* stored = propertylist::findArray(account->properties(), "Enabled Dataclasses");
    return stored != nullptr ? *stored : Array();
  }
};

using DeviceLocalSource = DeviceLocalAccount;

TEST_F(DeviceLocalAccount, IsShownUnderTheNameOfItsClass) {
  EXPECT_EQ(ASSDeviceLocalAccount::displayedShortAccountTypeString(), "On My Kallo");
  EXPECT_EQ(ASSDeviceLocalAccount::displayedAccountTypeString(), "On My Kallo");
}

TEST_F(DeviceLocalAccount, DoesNotPushAndIsUniqueByItsIdentifier) {
  EXPECT_FALSE(account->supportsPush());
  EXPECT_EQ(account->uniqueId(), "DeviceLocalAccount");
}

TEST_F(DeviceLocalSource, IsOpenedByNameWithoutAnAccount) {
  EXPECT_NE(ASSDeviceLocalAccount::createSyncDataSourceForDataclassOptions(kContacts, std::nullopt),
            nullptr);
  EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Contacts)",
                                     "createDataSource(Contacts, none, none)"}));
  EXPECT_EQ(device.logLines(), Lines{});
}

class OptionKeeper : public platform::ForwardingSyncDataSource {
 public:
  using ForwardingSyncDataSource::ForwardingSyncDataSource;
  Created createDataSource(const std::optional<std::string>& name,
                           const std::optional<std::string>& identifier,
                           const DataSourceOptions& options) override {
    kept = options;
    return ForwardingSyncDataSource::createDataSource(name, identifier, options);
  }
  DataSourceOptions kept;
};

TEST_F(DeviceLocalSource, OptionsAreThoseOfTheDataclassAndTheCallersOnTop) {
  struct Row {
    const char* name;
    const char* dataclass;
    DataSourceOptions given;
    DataSourceOptions passed;
  };
  const Row kRows[] = {
      {"contacts", kContacts, std::nullopt, std::nullopt},
      {"calendars", kCalendars, std::nullopt, Dictionary{{"EventsOnly", true}}},
      {"reminders", kReminders, std::nullopt, Dictionary{{"RemindersOnly", true}}},
      {"contacts with an option", kContacts, Dictionary{{"A", 1}}, Dictionary{{"A", 1}}},
      {"contacts with empty options", kContacts, Dictionary(), Dictionary()},
      {"calendars with empty options", kCalendars, Dictionary(), Dictionary{{"EventsOnly", true}}},
      {"calendars with another option", kCalendars, Dictionary{{"A", 1}},
       Dictionary{{"A", 1}, {"EventsOnly", true}}},
      {"calendars with the same option", kCalendars, Dictionary{{"EventsOnly", false}},
       Dictionary{{"EventsOnly", false}}},
  };
  OptionKeeper sources(device.syncDataSource);
  device.use<platform::SyncDataSource>(sources);
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.name);
    ASSDeviceLocalAccount::createSyncDataSourceForDataclassOptions(row.dataclass, row.given);
    EXPECT_EQ(sources.kept, row.passed);
  }
}

TEST_F(DeviceLocalSource, OpeningIsTriedWithoutANameForADataclassThatIsNotSynced) {
  EXPECT_EQ(ASSDeviceLocalAccount::createSyncDataSourceForDataclassOptions(kBackup, std::nullopt),
            nullptr);
  EXPECT_EQ(device.journal, (Journal{"createDataSource(none, none, none)"}));
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not create the datasource for the dataclass com.vantor.Dataclass.Backup "
                   "of the Device Local Account. Error there is no dataclass"}));
}

TEST_F(DeviceLocalSource, FailureToOpenIsLoggedAndWhatCameBackIsAnswered) {
  struct Row {
    const char* name;
    platform::PlannedAnswer answer;
    bool answersASource;
    const char* error;
  };
  const Row kRows[] = {
      {"failure without a source", {Status::failure(1, "refused"), false}, false, "refused"},
      {"failure with a source", {Status::failure(1, "half open"), true}, true, "half open"},
      {"failure without an error", {Status{1, std::nullopt}, false}, false, "(null)"},
      {"success without a source", {Status::success(), false}, false, "(null)"},
  };
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.name);
    device.systemLog.clear();
    device.syncDataSource.answerNext("createDataSource", row.answer);
    const DataSourcePtr source =
        ASSDeviceLocalAccount::createSyncDataSourceForDataclassOptions(kContacts, std::nullopt);
    EXPECT_EQ(source != nullptr, row.answersASource);
    EXPECT_EQ(device.logLines(),
              (Lines{"Could not create the datasource for the dataclass "
                     "com.vantor.Dataclass.Contacts of the Device Local Account. Error " +
                     std::string(row.error)}));
  }
}

TEST_F(DeviceLocalAccount, TurnsTetheredSyncingOnAndThenRecordsTheDataclass) {
  account->setEnabledForDataclass(true, kContacts);
  EXPECT_EQ(device.journal, (Journal{"setTetheredSyncingDisabled(Contacts, false)"}));
  EXPECT_EQ(enabled(), dataclasses({"Contacts", "Notes"}));
  account->setEnabledForDataclass(false, "com.vantor.Dataclass.Notes");
  EXPECT_EQ(device.journal, (Journal{"setTetheredSyncingDisabled(Contacts, false)",
                                     "setTetheredSyncingDisabled(Notes, true)"}));
  EXPECT_EQ(enabled(), dataclasses({"Contacts"}));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(DeviceLocalAccount, IsTurnedOnThroughTheRecordToo) {
  const AccountPtr asRecord = account;
  asRecord->setEnabledForDataclass(true, kContacts);
  EXPECT_EQ(device.journal, (Journal{"setTetheredSyncingDisabled(Contacts, false)"}));
}

TEST_F(DeviceLocalAccount, StaysAsItIsForADataclassThatIsNotSynced) {
  account->setEnabledForDataclass(true, kBackup);
  EXPECT_EQ(device.journal, Journal{});
  EXPECT_EQ(enabled(), dataclasses({"Notes"}));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(DeviceLocalAccount, StaysAsItIsForASyncedDataclassThatItsTypeLacks) {
  account->setEnabledForDataclass(true, kMail);
  EXPECT_EQ(device.journal, (Journal{"setTetheredSyncingDisabled(MailAccounts, false)"}));
  EXPECT_EQ(enabled(), dataclasses({"Notes"}));
}

TEST_F(DeviceLocalAccount, StaysAsItIsWhenThePlatformFails) {
  device.syncDataSource.failNext("setTethered", Status::failure(1, "not now"));
  account->setEnabledForDataclass(true, kContacts);
  device.syncDataSource.failNext("setTethered", Status{1, std::nullopt});
  account->setEnabledForDataclass(false, "com.vantor.Dataclass.Notes");
  EXPECT_EQ(enabled(), dataclasses({"Notes"}));
  EXPECT_EQ(
      device.logLines(),
      (Lines{"Could not ENABLE the datasource for the dataclass com.vantor.Dataclass.Contacts of "
             "the Device Local Account. Error not now",
             "Could not DISABLE the datasource for the dataclass com.vantor.Dataclass.Notes of the "
             "Device Local Account. Error (null)"}));
}

TEST_F(DeviceLocalAccount, TetheredStepAloneLeavesTheStoredList) {
  account->setTetheredEnabledForDataclass(true, kContacts);
  account->setTetheredEnabledForDataclass(false, "com.vantor.Dataclass.Notes");
  EXPECT_EQ(device.journal, (Journal{"setTetheredSyncingDisabled(Contacts, false)",
                                     "setTetheredSyncingDisabled(Notes, true)"}));
  EXPECT_EQ(enabled(), dataclasses({"Notes"}));
}

TEST_F(DeviceLocalAccount, TetheredStepTellsWhetherItWasDone) {
  EXPECT_TRUE(account->_setTetheredDataSourceEnabledForDataclass(true, kContacts));
  EXPECT_FALSE(account->_setTetheredDataSourceEnabledForDataclass(true, kBackup));
  device.syncDataSource.failNext("setTethered");
  EXPECT_FALSE(account->_setTetheredDataSourceEnabledForDataclass(false, kContacts));
}

TEST_F(DeviceLocalAccount, CalendarsAndRemindersAreTurnedOnAsOne) {
  account->setEnabledForDataclass(true, kCalendars);
  account->setEnabledForDataclass(true, kReminders);
  EXPECT_EQ(device.journal, (Journal{"setTetheredSyncingDisabled(Calendars, false)",
                                     "setTetheredSyncingDisabled(Calendars, false)"}));
  EXPECT_EQ(enabled(), dataclasses({"Calendars", "Reminders", "Notes"}));
}

TEST_F(DeviceLocalSource, DeletingRemovesTheStoreOfAnyDataclassWithoutOptions) {
  account->deleteLocalDataSourceForDataclass(kContacts);
  account->deleteLocalDataSourceForDataclass(kCalendars);
  account->deleteLocalDataSourceForDataclass(kReminders);
  EXPECT_EQ(device.journal, (Journal{
                                "dataclassNameForSyncType(Contacts)",
                                "createDataSource(Contacts, none, none)",
                                "removeStore(local Contacts, false)",
                                "deleteDataSource(local Contacts)",
                                "dataclassNameForSyncType(Calendars)",
                                "createDataSource(Calendars, none, none)",
                                "removeStore(local Calendars, false)",
                                "deleteDataSource(local Calendars)",
                                "dataclassNameForSyncType(Calendars)",
                                "createDataSource(Calendars, none, none)",
                                "removeStore(local Calendars, false)",
                                "deleteDataSource(local Calendars)",
                            }));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(DeviceLocalSource, DeletingSucceedsExactlyWhenTheSourceWasClosedOrNoneWasThere) {
  const std::string couldNotCreate =
      "Could not create the datasource for the dataclass com.vantor.Dataclass.Contacts of the "
      "Device Local Account. Error ";
  const std::string couldNotDelete =
      "Could not delete the datasource for the dataclass com.vantor.Dataclass.Contacts of the "
      "Device Local Account. Error ";
  struct Row {
    const char* name;
    std::optional<platform::PlannedAnswer> creating;
    std::optional<Status> removing;
    std::optional<Status> closing;
    bool answer;
    Lines lines;
    int removals;
  };
  const Row kRows[] = {
      {"all goes well", {}, {}, {}, true, {}, 1},
      {"the store cannot be removed",
       {},
       Status::failure(1, "in use"),
       {},
       true,
       {couldNotDelete + "in use"},
       1},
      {"the source cannot be closed",
       {},
       {},
       Status::failure(2, "busy"),
       false,
       {"Deleting the DataSource failed with error: busy"},
       1},
      {"neither",
       {},
       Status::failure(1, "in use"),
       Status{2, std::nullopt},
       false,
       {couldNotDelete + "in use", "Deleting the DataSource failed with error: (null)"},
       1},
      {"a source comes with a failure",
       platform::PlannedAnswer{Status::failure(3, "half"), true},
       {},
       {},
       true,
       {couldNotCreate + "half"},
       0},
      {"no source and a failure",
       platform::PlannedAnswer{Status::failure(3, "none"), false},
       {},
       {},
       false,
       {couldNotCreate + "none"},
       0},
      {"no source and a success",
       platform::PlannedAnswer{Status::success(), false},
       {},
       {},
       true,
       {couldNotCreate + "(null)"},
       0},
  };
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.name);
    device.systemLog.clear();
    device.journal.clear();
    device.syncDataSource.answerNormally();
    if (row.creating) device.syncDataSource.answerNext("createDataSource", *row.creating);
    if (row.removing) device.syncDataSource.failNext("removeStore", *row.removing);
    if (row.closing) device.syncDataSource.failNext("deleteDataSource", *row.closing);
    EXPECT_EQ(account->_deleteDataSourceForDataclass(kContacts), row.answer);
    EXPECT_EQ(device.logLines(), row.lines);
    EXPECT_EQ(std::count(device.journal.begin(), device.journal.end(),
                         "removeStore(local Contacts, false)"),
              row.removals);
  }
}

class ExternalNames : public platform::ForwardingSyncDataSource {
 public:
  using ForwardingSyncDataSource::ForwardingSyncDataSource;
  ExternalSources externalSourcesEnabledForSyncType(platform::SyncDataType) override {
    return {status, names};
  }
  Status status;
  std::optional<std::vector<std::string>> names;
};

TEST_F(DeviceLocalAccount, AnotherSourceServesWhenAnyNameIsLeftBesideDenyTethered) {
  struct Row {
    const char* name;
    std::optional<std::vector<std::string>> names;
    bool answer;
  };
  const Row kRows[] = {
      {"no list", std::nullopt, false},
      {"empty list", {{}}, false},
      {"denial", {{"DenyTethered"}}, false},
      {"denial twice", {{"DenyTethered", "DenyTethered"}}, false},
      {"denial and a name", {{"DenyTethered", "x"}}, true},
      {"a name between denials", {{"DenyTethered", "x", "DenyTethered"}}, true},
      {"another spelling", {{"denytethered"}}, true},
      {"an empty name", {{""}}, true},
  };
  ExternalNames sources(device.syncDataSource);
  device.use<platform::SyncDataSource>(sources);
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.name);
    sources.names = row.names;
    EXPECT_EQ(account->otherAccountEnabledForDataclass(kContacts), row.answer);
  }
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(DeviceLocalAccount, AnotherSourceIsAssumedWhenThePlatformCannotTell) {
  device.syncDataSource.failNext("externalSources", Status::failure(1, "gone"));
  EXPECT_TRUE(account->otherAccountEnabledForDataclass(kReminders));
  EXPECT_TRUE(account->otherAccountEnabledForDataclass(kBackup));
  EXPECT_EQ(device.journal, (Journal{"externalSourcesEnabledForSyncType(Calendars)"}));
  EXPECT_EQ(device.logLines(),
            (Lines{"[-[ASSDeviceLocalAccount(AccountSettingsUI) otherAccountEnabledForDataclass:]]"
                   "Error while retreiving external sources for dataclass "
                   "com.vantor.Dataclass.Reminders [gone]",
                   "[-[ASSDeviceLocalAccount(AccountSettingsUI) otherAccountEnabledForDataclass:]]"
                   "Error while retreiving external sources for dataclass "
                   "com.vantor.Dataclass.Backup [(null)]"}));
}

TEST_F(DeviceLocalAccount, SavesItselfInPlaceOfTheOneInTheFile) {
  writeAccounts({accountInfo("Mail", "mail", {"Mail"}), deviceLocalInfo({"Notes"})});
  account->setEnabledForDataclass(true, kContacts);
  account->_saveChangesToOnMyDeviceAccount();
  EXPECT_EQ(savedProperty("OnMyDevice", "Enabled Dataclasses"),
            Value(dataclasses({"Contacts", "Notes"})));
  EXPECT_EQ(savedProperty("Mail", "Identifier"), Value("mail"));
  EXPECT_EQ(settingsReads(), 2U);  // the fresh store, and the merge of its save
  EXPECT_EQ(device.logLines(), Lines{});
}

}  // namespace
}  // namespace localdata
