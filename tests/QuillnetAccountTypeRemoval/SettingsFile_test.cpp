#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

namespace fs = std::filesystem;
using platform::Status;

constexpr const char* kFailureLine =
    "Failed to save accounts to filesystem. Maybe the information did not conform to a plist.";

mode_t modeOf(const std::string& path) {
  struct stat status = {};
  return ::lstat(path.c_str(), &status) == 0 ? status.st_mode & 07777U : 0;
}

std::string contentOf(const std::string& path) {
  std::ifstream file(path, std::fstream::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

void writeFile(const std::string& path, std::string_view content) {
  std::ofstream(path, std::fstream::binary) << content;
}

// File services whose temporary names a test chooses; after these, tempnam's.
class ChosenNames : public platform::JournaledFileServices {
 public:
  explicit ChosenNames(Lines chosen) : _chosen(std::move(chosen)) {}
  std::optional<std::string> temporaryFileName() override {
    if (_chosen.empty()) return JournaledFileServices::temporaryFileName();
    std::string name = _chosen.front();
    _chosen.erase(_chosen.begin());
    return name;
  }

 private:
  Lines _chosen;
};

class SettingsFile : public ::testing::Test {
 protected:
  static void saveOneAccount() {
    ASSAccountsManager::initWithAccounsInfoArray(Array{accountInfo("1")})->saveAllAccounts();
  }
  std::string aside(int n) const {
    return device.settingsPath() + ".unreadable-" + std::to_string(n);
  }
  Lines namesBesideTheSettings() const {
    Lines names;
    for (const auto& entry : fs::directory_iterator(fs::path(device.settingsPath()).parent_path()))
      names.push_back(entry.path().filename());
    std::sort(names.begin(), names.end());
    return names;
  }
  AccountsDevice device;
};

// A call with the paths and sizes of this run replaced by words.
std::string neutral(std::string call, const AccountsDevice& device) {
  const auto replace = [&](const std::string& text, const std::string& word) {
    for (std::size_t at = call.find(text); at != std::string::npos; at = call.find(text))
      call.replace(at, text.size(), word);
  };
  replace(device.settingsPath(), "SETTINGS");
  for (std::size_t at = call.find(device.root() + "/tmp/"); at != std::string::npos;
       at = call.find(device.root() + "/tmp/"))
    call.replace(at, call.find_first_of(",)", at) - at, "TEMPORARY");
  if (call.starts_with("writeAll")) call = "writeAll(all bytes)";
  return call;
}

TEST_F(SettingsFile, IsReplacedInExactlyTheseSteps) {
  device.userDatabase.users["mobile"] = 501;
  device.userDatabase.groups["mobile"] = 502;
  device.fileServices.answerEvery("setOwner", {Status::success(), false});
  const AccountsManagerPtr store =
      ASSAccountsManager::initWithAccounsInfoArray(Array{accountInfo("1")});
  CallJournal journal;
  device.fileServices.alsoNoteCallsIn(&journal);
  device.userDatabase.alsoNoteCallsIn(&journal);
  store->saveAllAccounts();
  for (std::string& call : journal) call = neutral(call, device);
  EXPECT_EQ(journal,
            (CallJournal{
                "readPropertyListFile(SETTINGS)", "userIdentifierForName(mobile)",
                "groupIdentifierForName(mobile)", "temporaryFileName()",
                "createPrivateFile(TEMPORARY)", "writeAll(all bytes)", "setOwner(501, 502)",
                "makePrivate()", "synchronizeFile()", "checkName(TEMPORARY)", "closeFile()",
                "renameFileToFile(TEMPORARY, SETTINGS)", "synchronizeDirectoryOfFile(SETTINGS)"}));
  EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"1"}));
  EXPECT_TRUE(device.journal.empty());
  device.fileServices.alsoNoteCallsIn(nullptr);
  device.userDatabase.alsoNoteCallsIn(nullptr);
}

TEST_F(SettingsFile, IsOwnedByMobile) {
  if (::geteuid() != 0) GTEST_SKIP() << "only root can give a file to somebody else";
  device.userDatabase.users["mobile"] = 501;
  device.userDatabase.groups["mobile"] = 502;
  saveOneAccount();
  struct stat status = {};
  ASSERT_EQ(::stat(device.settingsPath().c_str(), &status), 0);
  EXPECT_EQ(status.st_uid, 501U);
  EXPECT_EQ(status.st_gid, 502U);
}

// Looks at the temporary file's mode in the middle of a save.
class ModeWatchingFiles : public platform::PosixFileServices {
 public:
  Opened createPrivateFile(const std::string& path) override {
    Opened opened = PosixFileServices::createPrivateFile(path);
    atCreation = modeOf(path);
    return opened;
  }
  Status renameFileToFile(const std::string& from, const std::string& to) override {
    atRename = modeOf(from);
    return PosixFileServices::renameFileToFile(from, to);
  }
  mode_t atCreation = 07777;
  mode_t atRename = 07777;
};

TEST_F(SettingsFile, IsReadableByItsOwnerOnlyAtEveryInstantWhateverTheMask) {
  for (const mode_t mask : {mode_t{0}, mode_t{022}, mode_t{0777}}) {
    SCOPED_TRACE(mask);
    ModeWatchingFiles files;
    device.use<platform::FileServices>(files);
    device.writeAccounts({});
    ::chmod(device.settingsPath().c_str(), 0644);
    const mode_t former = ::umask(mask);
    saveOneAccount();
    ::umask(former);
    EXPECT_EQ(files.atCreation & 0177U, 0U);
    EXPECT_EQ(files.atRename, 0600U);
    EXPECT_EQ(modeOf(device.settingsPath()), 0600U);
    device.use<platform::FileServices>(device.fileServices);
  }
}

TEST_F(SettingsFile, DoesNotLeakItsDescriptorToOtherPrograms) {
  bool closesOnExec = false;
  class Watching : public platform::PosixFileServices {
   public:
    explicit Watching(bool& answer) : _answer(answer) {}
    Opened createPrivateFile(const std::string& path) override {
      Opened opened = PosixFileServices::createPrivateFile(path);
      const std::string link = "/proc/self/fdinfo/" + std::to_string(opened.descriptor);
      const std::string flags = contentOf(link);
      const std::size_t at = flags.find("flags:");
      _answer = at != std::string::npos &&
                (std::stoul(flags.substr(at + 6), nullptr, 8) & 02000000U) != 0;
      return opened;
    }

   private:
    bool& _answer;
  } files(closesOnExec);
  device.use<platform::FileServices>(files);
  saveOneAccount();
  EXPECT_TRUE(closesOnExec);
  device.use<platform::FileServices>(device.fileServices);
}

TEST_F(SettingsFile, ThatCannotBeReadIsSetAsideBeforeItIsReplaced) {
  const struct {
    const char* name;
    std::string bytes;
  } kCases[] = {
      {"no property list", "no property list"},
      {"empty", ""},
      {"an array", "<plist><array/></plist>"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    device.writeSettingsBytes(c.bytes);
    ::chmod(device.settingsPath().c_str(), 0644);
    ASSAccountsManager::init()->saveAllAccounts();
    EXPECT_EQ(device.savedAccounts(), Array());
    EXPECT_EQ(contentOf(aside(1)), c.bytes);
    EXPECT_EQ(modeOf(aside(1)), 0600U);
    fs::remove(aside(1));
  }
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(SettingsFile, ThatWasReadOrWasNotThereIsNotSetAside) {
  saveOneAccount();
  saveOneAccount();
  EXPECT_EQ(namesBesideTheSettings(), (Lines{"com.vantor.accountsettings.plist"}));
  EXPECT_EQ(device.countOfFileCalls("setAsideUnreadableFile"), 0U);
}

// Only the store's own reading failed, as by a disk that answered the second time.
TEST_F(SettingsFile, ThatTheStoreCouldNotReadIsSetAsideThoughTheSaveCanReadIt) {
  device.writeAccounts({accountInfo("never seen")});
  const std::string bytes = *device.readSettingsBytes();
  device.fileServices.failNext("readPropertyListFile(" + device.settingsPath());
  const AccountsManagerPtr store = ASSAccountsManager::init();
  ASSERT_EQ(store->count(), 0U);
  store->insertAccount(ASSBasicAccount::initWithProperties(accountInfo("1")));

  device.fileServices.failNext("renameFileToFile");
  store->saveAllAccounts();
  EXPECT_EQ(device.readSettingsBytes(), bytes);

  store->saveAllAccounts();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"1"}));
  EXPECT_EQ(contentOf(aside(1)), bytes);

  store->saveAllAccounts();  // the file is this store's own by now
  EXPECT_EQ(namesBesideTheSettings(), (Lines{"com.vantor.accountsettings.plist",
                                             "com.vantor.accountsettings.plist.unreadable-1"}));
  EXPECT_EQ(device.countOfFileCalls("setAsideUnreadableFile"), 2U);
}

TEST_F(SettingsFile, ThatIsUnreadableIsKeptWholeAndOnceWhicheverFileCallFails) {
  const std::string unreadable = "no property list";
  Lines walked;
  saveOneAccount();  // the catalogues are read by now
  for (int n = 1; n < 100; ++n) {
    SCOPED_TRACE(n);
    fs::remove(aside(1));
    fs::remove(device.settingsPath());
    device.writeSettingsBytes(unreadable);
    fs::remove(device.root() + "/other name");
    fs::create_hard_link(device.settingsPath(), device.root() + "/other name");  // so it is copied

    std::string failed;
    device.fileServices.decideBy(
        [&failed, n,
         count = 0](const std::string& call) mutable -> std::optional<platform::PlannedAnswer> {
          if (++count != n) return std::nullopt;
          failed = call.substr(0, call.find('('));
          return platform::PlannedAnswer{Status::failure(EIO, "injected"), false};
        });
    saveOneAccount();
    device.fileServices.decideBy(nullptr);
    if (failed.empty()) break;  // every call had its turn
    walked.push_back(failed);
    const bool saved = device.readSettingsBytes() != unreadable;
    EXPECT_TRUE(!saved || contentOf(aside(1)) == unreadable) << failed;
    EXPECT_TRUE(!fs::exists(aside(1)) || contentOf(aside(1)) == unreadable) << failed;

    saveOneAccount();  // without the fault
    EXPECT_EQ(contentOf(aside(1)), unreadable);
    EXPECT_FALSE(fs::exists(aside(2)));
    EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"1"}));
    EXPECT_EQ(device.temporaryFiles(), Lines());
  }
  const Lines copying = {"setAsideUnreadableFile", "createPrivateFile", "writeAll",
                         "synchronizeFile"};
  EXPECT_NE(std::search(walked.begin(), walked.end(), copying.begin(), copying.end()),
            walked.end());
}

TEST_F(SettingsFile, EachUnreadableOneIsKeptUnderANumberOfItsOwn) {
  for (const char* bytes : {"first", "second"}) {
    device.writeSettingsBytes("");
    fs::remove(device.settingsPath());  // another file, not the same one again
    device.writeSettingsBytes(bytes);
    saveOneAccount();
  }
  EXPECT_EQ(contentOf(aside(1)), "first");
  EXPECT_EQ(contentOf(aside(2)), "second");
}

TEST_F(SettingsFile, StaysWhenItCannotBeSetAside) {
  device.writeSettingsBytes("no property list");
  device.fileServices.failNext("setAsideUnreadableFile");
  saveOneAccount();
  EXPECT_EQ(device.readSettingsBytes(), "no property list");
  EXPECT_EQ(device.temporaryFiles(), Lines());
  EXPECT_EQ(device.logLines(), (Lines{kFailureLine}));
  EXPECT_EQ(device.countOfFileCalls("renameFileToFile"), 0U);
}

TEST_F(SettingsFile, LinkIsNotFollowedAndWhatItNamesStaysUntouched) {
  const std::string victim = device.root() + "/victim.plist";
  device.writeAccounts({accountInfo("behind the link")});
  fs::rename(device.settingsPath(), victim);
  const std::string bytes = contentOf(victim);
  fs::create_symlink(victim, device.settingsPath());
  EXPECT_EQ(ASSAccountsManager::init()->count(), 0U);
  saveOneAccount();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"1"}));
  EXPECT_TRUE(fs::is_regular_file(fs::symlink_status(device.settingsPath())));
  EXPECT_EQ(contentOf(victim), bytes);
  EXPECT_TRUE(fs::is_symlink(aside(1)));
}

TEST_F(SettingsFile, FIFOIsNeitherWaitedForNorLost) {
  ASSERT_EQ(::mkfifo(device.settingsPath().c_str(), 0600), 0);
  EXPECT_EQ(ASSAccountsManager::init()->count(), 0U);
  saveOneAccount();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"1"}));
  EXPECT_TRUE(fs::is_fifo(aside(1)));
}

TEST_F(SettingsFile, DirectoryFailsTheSaveAndStays) {
  fs::create_directory(device.settingsPath());
  saveOneAccount();
  EXPECT_TRUE(fs::is_directory(device.settingsPath()));
  EXPECT_EQ(device.temporaryFiles(), Lines());
  EXPECT_EQ(device.logLines(), (Lines{kFailureLine}));
}

TEST_F(SettingsFile, PlantedTemporaryNamesAreLeftAloneAndAnotherIsTaken) {
  const std::string victim = device.root() + "/victim";
  const std::string file = device.root() + "/tmp/planted-file";
  const std::string link = device.root() + "/tmp/planted-link";
  const std::string dangling = device.root() + "/tmp/planted-dangling";
  writeFile(victim, "victim");
  writeFile(file, "planted");
  fs::create_symlink(victim, link);
  fs::create_symlink(device.root() + "/not-there", dangling);
  ChosenNames files({file, link, dangling});
  device.use<platform::FileServices>(files);
  saveOneAccount();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"1"}));
  EXPECT_EQ(contentOf(victim), "victim");
  EXPECT_EQ(contentOf(file), "planted");
  EXPECT_FALSE(fs::exists(device.root() + "/not-there"));
  EXPECT_EQ(device.temporaryFiles(), (Lines{"planted-dangling", "planted-file", "planted-link"}));
  EXPECT_EQ(device.logLines(), Lines());
  device.use<platform::FileServices>(device.fileServices);
}

TEST_F(SettingsFile, SaveGivesUpWhenEveryNameIsTakenAndRemovesNothing) {
  const std::string file = device.root() + "/tmp/planted";
  writeFile(file, "planted");
  ChosenNames files(Lines(1000, file));
  device.use<platform::FileServices>(files);
  saveOneAccount();
  EXPECT_EQ(contentOf(file), "planted");
  EXPECT_EQ(device.readSettingsBytes(), std::nullopt);
  EXPECT_EQ(device.logLines(), (Lines{kFailureLine}));
  device.use<platform::FileServices>(device.fileServices);
}

}  // namespace
}  // namespace accountsettings
