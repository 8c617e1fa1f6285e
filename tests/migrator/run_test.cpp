// One run over several accounts: its store, its order, its answer.

#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <thread>
#include <type_traits>

#include "tests/migrator/MigratorTest.h"

namespace migrator {
namespace {

using WholeMigration = MigratorTest;
using Migrator = MigratorTest;

// Answers what a test wants in place of merging and removing.
class ScriptedMigrator : public MergeAndRemoveQuillnetAccounts {
 public:
  bool merged = true;
  bool removed = true;
  bool reallyRemoves = false;
  std::vector<std::string> calls;

 protected:
  bool _mergeAccountDataToLocalStore(const AccountPtr& account) override {
    calls.push_back("merge " + std::string(*account->identifier()));
    return merged;
  }
  bool _removeAccount(const AccountPtr& account) override {
    calls.push_back("remove " + std::string(*account->identifier()));
    if (reallyRemoves) MergeAndRemoveQuillnetAccounts::_removeAccount(account);
    return removed;
  }
};

static_assert(std::is_base_of_v<platform::DataClassMigrator, MergeAndRemoveQuillnetAccounts>);

TEST_F(Migrator, HasOneNameBeforeBetweenAndAfterRuns) {
  EXPECT_EQ(migrator.dataClassName(), "Quillnet Account Removal");
  EXPECT_EQ(settingsReads(), 0U);
  EXPECT_EQ(device.journal, Journal{});
  migrator.performMigration();
  EXPECT_EQ(migrator.dataClassName(), "Quillnet Account Removal");
  migrator.performMigration();
  EXPECT_EQ(migrator.dataClassName(), "Quillnet Account Removal");
  EXPECT_EQ(settingsReads(), 2U);
}

TEST_F(Migrator, LeavesLegacySettingsAndOtherProcessesAlone) {
  device.userDatabase.home = device.root() + "/var/mobile";
  const std::string legacy = accountsettings::mailAccountsPath();
  std::filesystem::create_directories(std::filesystem::path(legacy).parent_path());
  std::ofstream(legacy) << "legacy";
  device.writeSettings({{"Version", 7}, {"Accounts", Array{selectedInfo("Q", {})}}});
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.readSettings().find("Version")->asInteger(), 12);
  EXPECT_EQ(savedIdentifiers(), Lines{});
  EXPECT_EQ(device.fileLock.calls(), Journal{});
  EXPECT_EQ(device.processTable.calls(), Journal{});
  EXPECT_TRUE(std::filesystem::exists(legacy));
  for (const std::string& line : device.logLines()) {
    EXPECT_EQ(line.find("migration!"), std::string::npos) << line;
    EXPECT_EQ(line.find("out of date"), std::string::npos) << line;
  }
}

TEST_F(Migrator, HoldsNoStoreBeforeItsFirstRun) {
  EXPECT_EQ(migrator.manager(), nullptr);
  EXPECT_EQ(settingsReads(), 0U);
  EXPECT_EQ(device.journal, Journal{});
}

TEST_F(Migrator, ReleasesItsStoreAtTheNextRunAndAtItsEnd) {
  std::weak_ptr<accountsettings::ASSAccountsManager> first;
  std::weak_ptr<accountsettings::ASSAccountsManager> second;
  {
    OpenedUpMigrator shortLived;
    shortLived.performMigration();
    first = shortLived.manager();
    EXPECT_FALSE(first.expired());
    shortLived.performMigration();
    second = shortLived.manager();
    EXPECT_TRUE(first.expired());
    EXPECT_FALSE(second.expired());
  }
  EXPECT_TRUE(second.expired());
}

TEST_F(WholeMigration, SelectsAndRemovesInOneStore) {
  writeAccounts({selectedInfo("1", {}), accountInfo("Mail", "m", {}), selectedInfo("2", {})});
  migrator.performMigration();
  EXPECT_EQ(migrator.manager()->count(), 1U);
  EXPECT_EQ(migrator.manager()->allBasicAccounts()->front()->identifier(), "m");
  EXPECT_EQ(settingsReads(), 3U);  // the store, and the merge of two saves
}

TEST_F(WholeMigration, ExaminesAndRemovesThreeSelectedAccountsInARow) {
  writeAccounts({selectedInfo("1", {}), selectedInfo("2", {}), selectedInfo("3", {})});
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.logLines(), (Lines{"Checking account <ASSBasicAccount: 1> of type Quillnet",
                                      "Checking account <ASSBasicAccount: 2> of type Quillnet",
                                      "Checking account <ASSBasicAccount: 3> of type Quillnet"}));
  EXPECT_EQ(savedIdentifiers(), Lines{});
}

TEST_F(WholeMigration, HasSavedOneAccountsRemovalWhenItComesToTheNext) {
  writeAccounts(
      {selectedInfo("1", {"Notes"}), selectedInfo("2", {}), accountInfo("Mail", "m", {})});
  std::vector<Lines> savedAtEachCheck;
  log.listener = [&](std::string_view line) {
    if (line.starts_with("Checking")) savedAtEachCheck.push_back(savedIdentifiers());
  };
  migrator.performMigration();
  EXPECT_EQ(savedAtEachCheck, (std::vector<Lines>{{"1", "2", "m"}, {"2", "m"}, {"m"}}));
}

TEST_F(WholeMigration, InterruptedAfterTheFirstAccountLeavesTheSecondUntouched) {
  writeAccounts({selectedInfo("1", {"Notes"}), selectedInfo("2", {"Notes"})});
  device.syncDataSource.stores[{"Quillnet:ada", "Notes"}].records = {{"n", "note"}};
  log.listener = [](std::string_view line) {
    if (line == "Checking account <ASSBasicAccount: 2> of type Quillnet")
      throw std::runtime_error("the process ends");
  };
  EXPECT_THROW(migrator.performMigration(), std::runtime_error);
  EXPECT_EQ(savedIdentifiers(), Lines{"2"});
  EXPECT_EQ(savedProperty("Quillnet", "Enabled Dataclasses"), Value(dataclasses({"Notes"})));
  EXPECT_EQ(device.syncDataSource.records(std::nullopt, "Notes").size(), 1U);
}

TEST_F(WholeMigration, AnotherOneReadsTheFileAgain) {
  writeAccounts({selectedInfo("1", {}), accountInfo("Mail", "m", {})});
  migrator.performMigration();
  device.systemLog.clear();
  writeAccounts({accountInfo("Mail", "new", {}), selectedInfo("3", {})});
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.logLines(), (Lines{"Checking account <ASSBasicAccount: new> of type Mail",
                                      "Checking account <ASSBasicAccount: 3> of type Quillnet"}));
  EXPECT_EQ(savedIdentifiers(), Lines{"new"});
}

TEST_F(WholeMigration, RepeatedFindsOnlyWhatRemainsAndWritesNothing) {
  writeAccounts({selectedInfo("1", {"Contacts"}), accountInfo("Mail", "m", {})});
  migrator.performMigration();
  const std::optional<std::string> after = device.readSettingsBytes();
  device.journal.clear();
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.journal, Journal{"log: Checking account <ASSBasicAccount: m> of type Mail"});
  EXPECT_EQ(device.readSettingsBytes(), after);
}

TEST_F(WholeMigration, KeepsAnAccountWhoseMergeFailedAndGoesOn) {
  ScriptedMigrator scripted;
  scripted.merged = false;
  writeAccounts({selectedInfo("1", {}), selectedInfo("2", {})});
  EXPECT_TRUE(scripted.performMigration());
  EXPECT_EQ(scripted.calls, (Lines{"merge 1", "merge 2"}));
  EXPECT_EQ(device.logLines(), (Lines{"Checking account <ASSBasicAccount: 1> of type Quillnet",
                                      "Quillnet account merge failed",
                                      "Checking account <ASSBasicAccount: 2> of type Quillnet",
                                      "Quillnet account merge failed"}));
  EXPECT_EQ(savedIdentifiers(), (Lines{"1", "2"}));
}

TEST_F(WholeMigration, MergesFirstAndDoesNotLookAtTheResultOfTheRemoval) {
  ScriptedMigrator scripted;
  scripted.removed = false;
  scripted.reallyRemoves = true;
  writeAccounts(
      {selectedInfo("1", {}), accountInfo("Quillnet", "kept", {}), selectedInfo("2", {})});
  EXPECT_TRUE(scripted.performMigration());
  EXPECT_EQ(scripted.calls, (Lines{"merge 1", "remove 1", "merge 2", "remove 2"}));
  EXPECT_EQ(savedIdentifiers(), Lines{"kept"});
  EXPECT_EQ(device.logLines().size(), 3U);
}

TEST_F(WholeMigration, AnswersTrueWhenTheSaveFailsAndGoesOn) {
  writeAccounts({selectedInfo("1", {}), selectedInfo("2", {})});
  device.userDatabase.users.clear();
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(savedIdentifiers(), (Lines{"1", "2"}));
  EXPECT_EQ(migrator.manager()->count(), 0U);
  const char* failed =
      "Failed to save accounts to filesystem. Maybe the information did not conform to a plist.";
  EXPECT_EQ(device.logLines(),
            (Lines{"Checking account <ASSBasicAccount: 1> of type Quillnet", failed,
                   "Checking account <ASSBasicAccount: 2> of type Quillnet", failed}));
}

TEST_F(WholeMigration, StaysOnTheCallingThread) {
  const std::thread::id caller = std::this_thread::get_id();
  int calls = 0;
  const auto watch = [&](const std::string&) {
    ++calls;
    EXPECT_EQ(std::this_thread::get_id(), caller);
    return std::optional<platform::PlannedAnswer>();
  };
  device.syncDataSource.decideBy(watch);
  device.contactsStore.decideBy(watch);
  device.calendarStore.decideBy(watch);
  device.fileServices.decideBy(watch);
  device.preferences.decideBy(watch);
  log.listener = [&](std::string_view) { EXPECT_EQ(std::this_thread::get_id(), caller); };
  writeAccounts({selectedInfo("1", {"Contacts", "Calendars", "Bookmarks"})});
  migrator.performMigration();
  EXPECT_GT(calls, 30);
}

}  // namespace
}  // namespace migrator
