#include <gtest/gtest.h>

#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <limits>
#include <new>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

using platform::PlannedAnswer;
using platform::Status;

constexpr const char* kFailureLine =
    "Failed to save accounts to filesystem. Maybe the information did not conform to a plist.";

std::ptrdiff_t countOfOpenDescriptors() {
  return std::distance(std::filesystem::directory_iterator("/proc/self/fd"),
                       std::filesystem::directory_iterator());
}

// The file holds "1" and "2"; the store has changed "1", added a child and deleted "2".
class SavingFaults : public ::testing::Test {
 protected:
  SavingFaults() {
    device.writeAccounts({before(), accountInfo("2")});
    bytesBefore = *device.readSettingsBytes();
    loadAndChange();
  }
  void loadAndChange() {
    device.writeSettingsBytes(bytesBefore);
    store = OpenStore::ofFile();
    store->accountWithIdentifier("1")->setAccountPropertyForKey(2, "n");
    store->addChildToAccount(ASSBasicAccount::initWithProperties(accountInfo("c")),
                             store->accountWithIdentifier("1"));
    store->deleteAccountWithIdentifier("2");
    device.systemLog.clear();
  }
  static Dictionary before() { return accountInfo("1", "CalDAV", {{"n", 1}}); }
  static Dictionary after() {
    return accountInfo("1", "CalDAV", {{"n", 2}, {"ChildAccounts", Array{accountInfo("c")}}});
  }
  // The file, the temporary directory, memory and the log are as after a save that failed.
  void expectFailedSave() {
    EXPECT_EQ(device.readSettingsBytes(), bytesBefore);
    EXPECT_EQ(device.temporaryFiles(), Lines());
    EXPECT_EQ(device.logLines(), (Lines{kFailureLine}));
    const AccountPtr account = store->accountWithIdentifier("1");
    ASSERT_NE(account, nullptr);
    EXPECT_EQ(account->properties(), after());
    EXPECT_EQ(account->originalProperties(), before());
    EXPECT_EQ(store->children(), (Lines{"c of 1"}));
    EXPECT_EQ(store->originalAccountsByID().size(), 2U);
  }
  void expectSaved() {
    EXPECT_EQ(device.readSettings(), (Dictionary{{"Version", 12}, {"Accounts", Array{after()}}}));
    EXPECT_EQ(device.temporaryFiles(), Lines());
    EXPECT_EQ(store->accountWithIdentifier("1")->originalProperties(), after());
  }
  AccountsDevice device;
  std::string bytesBefore;
  std::shared_ptr<OpenStore> store;
};

TEST_F(SavingFaults, WhicheverFileCallFailsTheFileIsTheOldOrTheNewOneWhole) {
  Lines walked;
  for (int n = 1; n < 100; ++n) {
    SCOPED_TRACE(n);
    loadAndChange();
    const std::ptrdiff_t descriptors = countOfOpenDescriptors();

    std::string failed;
    device.fileServices.decideBy(
        [&failed, n, count = 0](const std::string& call) mutable -> std::optional<PlannedAnswer> {
          if (++count != n) return std::nullopt;
          failed = call.substr(0, call.find('('));
          return PlannedAnswer{Status::failure(EIO, "injected"), false};
        });
    store->saveAllAccounts();
    device.fileServices.decideBy(nullptr);
    EXPECT_EQ(countOfOpenDescriptors(), descriptors);
    if (failed.empty()) break;  // every call had its turn

    const bool saved = device.logLines().empty();
    walked.push_back(failed + (saved ? ": saved" : ": not saved"));
    if (saved)
      expectSaved();
    else
      expectFailedSave();
    store->saveAllAccounts();  // without the fault
    expectSaved();
  }
  EXPECT_EQ(walked,
            (Lines{"readPropertyListFile: saved", "temporaryFileName: not saved",
                   "createPrivateFile: not saved", "writeAll: not saved", "setOwner: not saved",
                   "makePrivate: not saved", "synchronizeFile: not saved", "checkName: not saved",
                   "closeFile: not saved", "renameFileToFile: not saved",
                   "synchronizeDirectoryOfFile: saved"}));
}

TEST_F(SavingFaults, FileOfAnotherInTheTemporaryFilesPlaceNeverBecomesTheSettings) {
  namespace fs = std::filesystem;
  const fs::path secret = fs::path(device.settingsPath()).replace_filename("secret");
  fs::copy_file(device.settingsPath(), secret);
  device.fileServices.decideBy([&](const std::string& call) -> std::optional<PlannedAnswer> {
    if (call.starts_with("synchronizeFile")) {
      const fs::path temporary = fs::temp_directory_path() / device.temporaryFiles().at(0);
      fs::remove(temporary);
      fs::create_symlink(secret, temporary);
    }
    return std::nullopt;
  });
  store->saveAllAccounts();
  device.fileServices.decideBy(nullptr);
  EXPECT_FALSE(fs::is_symlink(device.settingsPath()));
  expectFailedSave();
  store->saveAllAccounts();  // left alone
  expectSaved();
}

TEST_F(SavingFaults, MemoryThatRunsOutInAFileCallFailsTheSaveAndLeavesNothing) {
  for (const char* call :
       {"readPropertyListFile", "temporaryFileName", "createPrivateFile", "writeAll", "setOwner",
        "makePrivate", "synchronizeFile", "checkName", "renameFileToFile"}) {
    SCOPED_TRACE(call);
    loadAndChange();
    const std::ptrdiff_t descriptors = countOfOpenDescriptors();
    device.fileServices.decideBy([call](const std::string& made) -> std::optional<PlannedAnswer> {
      if (made.starts_with(call)) throw std::bad_alloc();
      return std::nullopt;
    });
    store->saveAllAccounts();
    device.fileServices.decideBy(nullptr);
    EXPECT_EQ(countOfOpenDescriptors(), descriptors);
    expectFailedSave();
    store->saveAllAccounts();  // with memory again
    expectSaved();
  }
}

TEST_F(SavingFaults, MemoryThatRunsOutBehindTheRenameDoesNotUndoTheSave) {
  device.fileServices.decideBy([](const std::string& made) -> std::optional<PlannedAnswer> {
    if (made.starts_with("synchronizeDirectoryOfFile")) throw std::bad_alloc();
    return std::nullopt;
  });
  store->saveAllAccounts();
  EXPECT_EQ(device.logLines(), Lines());
  expectSaved();
}

// Makes what it saves anew whenever it is asked, and has no memory for that at one of the times.
class ScarceAccount : public OpenAccount {
 public:
  using OpenAccount::OpenAccount;
  static std::shared_ptr<ScarceAccount> initWithProperties(const Dictionary& properties) {
    return _recordWithProperties<ScarceAccount>(properties);
  }
  const Dictionary& propertiesToSave() const override {
    if (--askedUntilFailure == 0) throw std::bad_alloc();
    return properties();
  }
  static inline int askedUntilFailure = 0;
};

TEST_F(SavingFaults, WheneverMemoryRunsOutForWhatIsSavedFileAndBasesAreOldOrNewTogether) {
  Lines walked;
  for (int n = 1; n < 100; ++n) {
    SCOPED_TRACE(n);
    const Array old{accountInfo("1", "CalDAV", {{"n", 1}}), accountInfo("2", "CalDAV", {{"n", 1}})};
    const Array changed{accountInfo("1", "CalDAV", {{"n", 2}}),
                        accountInfo("2", "CalDAV", {{"n", 2}})};
    device.writeAccounts(old);
    device.systemLog.clear();
    ScarceAccount::askedUntilFailure = 0;
    const AccountArray accounts{ScarceAccount::initWithProperties(*old[0].asDictionary()),
                                ScarceAccount::initWithProperties(*old[1].asDictionary())};
    store->replaceAccountsWithTypesWithAccounts({"CalDAV"}, accounts);
    for (const AccountPtr& account : accounts) account->setAccountPropertyForKey(2, "n");

    ScarceAccount::askedUntilFailure = n;
    store->saveAllAccounts();
    if (ScarceAccount::askedUntilFailure > 0) break;  // every time had its turn
    const bool saved = device.savedAccounts() == changed;
    walked.emplace_back(saved ? "saved" : "not saved");
    EXPECT_EQ(device.savedAccounts(), saved ? changed : old);
    EXPECT_EQ(device.logLines(), saved ? Lines() : Lines{kFailureLine});
    for (const AccountPtr& account : accounts)
      EXPECT_EQ(account->originalProperties().find("n")->asInteger(), saved ? 2 : 1);
  }
  EXPECT_EQ(walked, (Lines{"not saved", "not saved"}));
}

TEST_F(SavingFaults, WriteThatStopsHalfWayLeavesTheOldFile) {
  device.fileServices.answerNext("writeAll", {Status::failure(ENOSPC, "disk full"), true});
  store->saveAllAccounts();
  expectFailedSave();
}

TEST_F(SavingFaults, FailedRemovalOfTheTemporaryFileIsIgnored) {
  device.fileServices.failNext("renameFileToFile");
  device.fileServices.failNext("removeFile");
  store->saveAllAccounts();
  EXPECT_EQ(device.readSettingsBytes(), bytesBefore);
  EXPECT_EQ(device.logLines(), (Lines{kFailureLine}));
}

TEST_F(SavingFaults, NoTemporaryNameMeansNothingIsCreatedOrRemoved) {
  device.fileServices.failNext("temporaryFileName");
  store->saveAllAccounts();
  expectFailedSave();
  EXPECT_EQ(device.countOfFileCalls("createPrivateFile"), 0U);
  EXPECT_EQ(device.countOfFileCalls("removeFile"), 0U);
}

TEST_F(SavingFaults, WithoutTheUserOrGroupMobileNothingIsWritten) {
  device.userDatabase.users.erase("mobile");
  store->saveAllAccounts();
  expectFailedSave();
  device.userDatabase.users["mobile"] = ::geteuid();
  device.userDatabase.groups.erase("mobile");
  device.systemLog.clear();
  store->saveAllAccounts();
  expectFailedSave();
  EXPECT_EQ(device.countOfFileCalls("createPrivateFile"), 0U);
}

TEST_F(SavingFaults, ValueThatTheBinaryFormCannotHoldFailsTheSave) {
  const struct {
    const char* name;
    Value value;
  } kCases[] = {
      {"a string that is not UTF-8", "\xff\xfe"},
      {"a date that is no number", propertylist::Date{std::numeric_limits<double>::quiet_NaN()}},
  };
  const AccountPtr account = store->accountWithIdentifier("1");
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    device.systemLog.clear();
    account->setAccountPropertyForKey(c.value, "bad");
    store->saveAllAccounts();
    account->removeAccountPropertyForKey("bad");
    expectFailedSave();
  }
  store->saveAllAccounts();
  expectSaved();
}

TEST_F(SavingFaults, MissingDirectoryFailsTheSave) {
  const std::string directory = std::filesystem::path(device.settingsPath()).parent_path();
  std::filesystem::rename(directory, directory + ".away");
  store->saveAllAccounts();
  EXPECT_EQ(device.logLines(), (Lines{kFailureLine}));
  EXPECT_EQ(device.temporaryFiles(), Lines());
  std::filesystem::rename(directory + ".away", directory);
  EXPECT_EQ(device.readSettingsBytes(), bytesBefore);
}

TEST_F(SavingFaults, FailedSaveIsMergedFromTheSameBaseNextTime) {
  device.fileServices.failNext("renameFileToFile");
  store->saveAllAccounts();
  device.writeAccounts({with(before(), "d", 6), accountInfo("2")});
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{with(after(), "d", 6)});
}

}  // namespace
}  // namespace accountsettings
