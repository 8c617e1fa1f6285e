// How the service's source of a dataclass is found and opened.

#include "localdata/AccountSettingsUISyncDataController.h"
#include "platform/testing/ForwardingSyncDataSource.h"
#include "tests/localdata/LocalDataTest.h"

namespace localdata {
namespace {

using platform::DataSourcePtr;

class OpenedUpController : public AccountSettingsUISyncDataController {
 public:
  using AccountSettingsUISyncDataController::_createQuillnetDataSourceForDataclass;
};

class ServiceSource : public LocalDataTest {
 protected:
  ServiceSource() { controller.setSyncAccount(record(accountInfo("Quillnet", "q", {}))); }

  DataSourcePtr open(const std::string& shortName) {
    return controller._createQuillnetDataSourceForDataclass("com.vantor.Dataclass." + shortName);
  }
  // Puts an account with these children into the settings file.
  void writeParent(const std::string& identifier, std::vector<Value> children) {
    writeAccounts({with(accountInfo("Quillnet", identifier, {}),
                        {{"ChildAccounts", Array(std::move(children))}})});
  }
  Dictionary child(const char* identifier, const char* className) {
    return {{"Type", "CalDAV"},
            {"Class", className},
            {"Identifier", identifier},
            {"Sync Identifier", "sync of " + std::string(identifier)}};
  }

  OpenedUpController controller;
};

TEST_F(ServiceSource, IsThatOfTheAccountNameWhichTheSyncAgentKnows) {
  EXPECT_NE(open("Contacts"), nullptr);
  EXPECT_EQ(device.preferences.calls(),
            (Journal{"readApplicationPreference(com.vantor.OTASyncAgent, AccountName)"}));
  EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Contacts)",
                                     "createDataSource(Contacts, Quillnet:ada, none)"}));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(ServiceSource, TakesAnyTextAsTheAccountName) {
  setSyncAgentAccountName("");
  open("Contacts");
  setSyncAgentAccountName("a%@b%d");
  open("Contacts");
  EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Contacts)",
                                     "createDataSource(Contacts, Quillnet:, none)",
                                     "dataclassNameForSyncType(Contacts)",
                                     "createDataSource(Contacts, Quillnet:a%@b%d, none)"}));
}

TEST_F(ServiceSource, IsNoneWithoutAWordWhenTheAccountNameIsNoText) {
  const Value kNames[] = {Value(42),
                          Value(true),
                          Value(1.5),
                          Value(Dictionary{{"a", 1}}),
                          Value(Array{Value("ada")}),
                          Value(propertylist::Bytes{0x61})};
  for (const Value& name : kNames) {
    setSyncAgentAccountName(name);
    for (const char* dataclass : {"Contacts", "Calendars", "Reminders", "Bookmarks", "Backup"})
      EXPECT_EQ(open(dataclass), nullptr) << dataclass;
  }
  device.preferences.applications.clear();
  EXPECT_EQ(open("Contacts"), nullptr);
  EXPECT_EQ(open("Calendars"), nullptr);
  EXPECT_EQ(device.journal, Journal{});
  EXPECT_EQ(device.logLines(), Lines{});
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

TEST_F(ServiceSource, HasOptionsForCalendarsAndBookmarksOnly) {
  OptionKeeper sources(device.syncDataSource);
  device.use<platform::SyncDataSource>(sources);
  struct Row {
    const char* dataclass;
    platform::DataSourceOptions options;
  };
  const Row kRows[] = {
      {"Calendars", Dictionary{{"EventsOnly", true}}},
      {"Bookmarks", Dictionary{{"ClearHiddenBookmarks", true}}},
      {"Reminders", std::nullopt},
      {"Contacts", std::nullopt},
      {"Notes", std::nullopt},
      {"Mail", std::nullopt},
      {"Backup", std::nullopt},
  };
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.dataclass);
    sources.kept = Dictionary{{"not", "asked"}};
    open(row.dataclass);
    EXPECT_EQ(sources.kept, row.options);
  }
}

TEST_F(ServiceSource, OfCalendarsIsThatOfTheCalendarChildByItsBareIdentifier) {
  writeParent("q", {child("other", "CalDAVAccount"), child("cal-1", "MobileCalDAVAccount"),
                    child("cal-2", "MobileCalDAVAccount")});
  EXPECT_NE(open("Calendars"), nullptr);
  EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Calendars)",
                                     "createDataSource(Calendars, cal-1, {EventsOnly})",
                                     "countRecords(cal-1 Calendars {EventsOnly})"}));
  EXPECT_EQ(settingsReads(), 1U);
}

TEST_F(ServiceSource, OfCalendarsWithAChildNeedsNoAccountName) {
  device.preferences.applications.clear();
  writeParent("q", {child("cal", "MobileCalDAVAccount")});
  EXPECT_NE(open("Calendars"), nullptr);
}

TEST_F(ServiceSource, OfRemindersAndOthersLooksAtNoChild) {
  writeParent("q", {child("cal", "MobileCalDAVAccount")});
  open("Reminders");
  open("Contacts");
  EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Calendars)",
                                     "createDataSource(Calendars, Quillnet:ada, none)",
                                     "dataclassNameForSyncType(Contacts)",
                                     "createDataSource(Contacts, Quillnet:ada, none)"}));
  EXPECT_EQ(settingsReads(), 0U);
}

TEST_F(ServiceSource, OfCalendarsStaysThatOfTheAccountNameWithoutAFittingChild) {
  struct Row {
    const char* name;
    const char* parent;
    std::vector<Value> children;
  };
  const Row kRows[] = {
      {"no child", "q", {}},
      {"a child of another class", "q", {child("cal", "CalDAVAccount")}},
      {"another spelling of the class", "q", {child("cal", "mobileCalDAVAccount")}},
      {"a child of another parent", "another", {child("cal", "MobileCalDAVAccount")}},
  };
  for (const Row& row : kRows) {
    SCOPED_TRACE(row.name);
    device.journal.clear();
    writeParent(row.parent, row.children);
    open("Calendars");
    EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Calendars)",
                                       "createDataSource(Calendars, Quillnet:ada, {EventsOnly})",
                                       "countRecords(Quillnet:ada Calendars {EventsOnly})"}));
  }
}

TEST_F(ServiceSource, TopLevelAccountOfTheCalendarClassIsNoChild) {
  writeAccounts({accountInfo("Quillnet", "q", {}), child("cal", "MobileCalDAVAccount")});
  open("Calendars");
  EXPECT_EQ(device.journal[1], "createDataSource(Calendars, Quillnet:ada, {EventsOnly})");
}

TEST_F(ServiceSource, IsOpenedWithoutANameForADataclassThatIsNotSynced) {
  EXPECT_EQ(open("Backup"), nullptr);
  EXPECT_EQ(device.journal, (Journal{"createDataSource(none, Quillnet:ada, none)"}));
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not create the datasource for the dataclass com.vantor.Dataclass.Backup "
                   "of the Device Local Account. Error there is no dataclass"}));
}

TEST_F(ServiceSource, FailureToOpenIsLoggedAndWhatCameBackIsAnswered) {
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
    EXPECT_EQ(open("Notes") != nullptr, row.answersASource);
    EXPECT_EQ(device.logLines(),
              (Lines{"Could not create the datasource for the dataclass com.vantor.Dataclass.Notes "
                     "of the Device Local Account. Error " +
                     std::string(row.error)}));
  }
}

TEST_F(ServiceSource, OfCalendarsIsCountedOnceAlsoWhenItDidNotComeAndNothingIsSaid) {
  device.syncDataSource.failNext("createDataSource", Status::failure(1, "refused"));
  EXPECT_EQ(open("Calendars"), nullptr);
  EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Calendars)",
                                     "createDataSource(Calendars, Quillnet:ada, {EventsOnly})",
                                     "countRecords(none)"}));
  device.syncDataSource.failNext("countRecords", Status::failure(1, "locked"));
  EXPECT_NE(open("Calendars"), nullptr);
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not create the datasource for the dataclass "
                   "com.vantor.Dataclass.Calendars of the Device Local Account. Error refused"}));
}

}  // namespace
}  // namespace localdata
