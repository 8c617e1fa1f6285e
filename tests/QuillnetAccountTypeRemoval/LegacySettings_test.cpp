#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>

#include "QuillnetAccountTypeRemoval/AccountsDataMigrator.h"
#include "platform/testing/ForwardingFileServices.h"
#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr const char* kElevenIsOld =
    "Account Settings Version out of date: savedVersion=11, currentVersion=12";
constexpr const char* kNoVersion =
    "Account Settings plist is missing a version number, returning NO for migration";
constexpr const char* kFailed =
    "[+[ASSAccountsManager _migrateAccountsIfNeeded]] Accounts migration failed";

// Takes the place of the device's accounts data migrator.
class Migrator : public platform::RuntimeClass, public AccountsDataMigratorClass {
 public:
  std::string className() const override { return "AccountsDataMigrator"; }
  std::unique_ptr<AccountsDataMigrator> init() override {
    ++made;
    if (makesNone) return nullptr;
    return std::make_unique<Run>(*this);
  }

  bool makesNone = false;
  bool answer = true;
  std::function<void()> work = [] {};
  int made = 0;
  int ran = 0;
  int dropped = 0;

 private:
  class Run : public AccountsDataMigrator {
   public:
    explicit Run(Migrator& owner) : _owner(owner) {}
    ~Run() override { ++_owner.dropped; }
    Run(const Run&) = delete;
    Run& operator=(const Run&) = delete;
    bool executeMigrationSteps() override {
      ++_owner.ran;
      _owner.work();
      return _owner.answer;
    }

   private:
    Migrator& _owner;
  };
};

class LegacySettings : public ::testing::Test {
 protected:
  LegacySettings() {
    device.userDatabase.home = device.root() + "/var/mobile";
    device.classRegistry.bundles[_bundlePath()] = {{&migrator}, std::nullopt};
  }

  std::string _bundlePath() const {
    return device.root() + "/System/Library/DataClassMigrators/AccountMigrator.migrator";
  }
  void makeFile(const std::string& path) {
    std::filesystem::create_directories(std::filesystem::path(path).parent_path());
    std::ofstream(path) << "legacy";
  }
  static std::string contentOf(const std::string& path) {
    std::ifstream file(path);
    return {std::istreambuf_iterator<char>(file), {}};
  }
  void writeVersion(const Value& version) {
    device.writeSettings({{"Version", version}, {"Accounts", Array{}}});
  }
  // The flags as one text, "mail da new" with 1 or 0 each, all true before the question.
  std::string decision() {
    ASSAccountsManager::shouldMigrateOldMailAccountsOldDAAccountsNewAccountSettings(&mail, &da,
                                                                                    &newAccounts);
    return std::to_string(mail) + " " + std::to_string(da) + " " + std::to_string(newAccounts);
  }
  // The line that sums a decision up, its third number being the address of the third flag.
  static std::string summary(const std::string& first, const std::string& second,
                             const bool* third) {
    const auto number = static_cast<std::int32_t>(reinterpret_cast<std::uintptr_t>(third));
    return "Accounts settings needs migration! oldMailAccountsPresent=" + first +
           ", oldDAAccountsPresent=" + second +
           ", migrateNewAccountsInfo=" + std::to_string(number);
  }
  // The log lines with that third number, which a caller cannot know, as "*".
  Lines linesWithoutAddresses() const {
    Lines lines = device.logLines();
    constexpr std::string_view kLast = "migrateNewAccountsInfo=";
    for (std::string& line : lines)
      if (const std::size_t at = line.find(kLast); at != std::string::npos)
        line.replace(at + kLast.size(), std::string::npos, "*");
    return lines;
  }
  static std::string found(const std::string& first, const std::string& second) {
    return "Accounts settings needs migration! oldMailAccountsPresent=" + first +
           ", oldDAAccountsPresent=" + second + ", migrateNewAccountsInfo=*";
  }

  AccountsDevice device;
  Migrator migrator;
  bool mail = true;
  bool da = true;
  bool newAccounts = true;
};

TEST_F(LegacySettings, LieBelowTheHomeDirectory) {
  device.userDatabase.home = "/var/mobile";
  EXPECT_EQ(mailAccountsPath(), "/var/mobile/Library/Mail/Accounts.plist");
  EXPECT_EQ(daAccountPath(), "/var/mobile/Library/Preferences/com.vantor.DataAccess.plist");
}

TEST_F(LegacySettings, AreFoundAsAFileAndAsADirectory) {
  EXPECT_FALSE(ASSAccountsManager::_oldMailAccountsInformationFound());
  EXPECT_FALSE(ASSAccountsManager::_oldDAAccountsInformationFound());
  makeFile(mailAccountsPath());
  std::filesystem::create_directories(daAccountPath());
  EXPECT_TRUE(ASSAccountsManager::_oldMailAccountsInformationFound());
  EXPECT_TRUE(ASSAccountsManager::_oldDAAccountsInformationFound());
}

TEST_F(LegacySettings, AMissingOrUnreadableSettingsFileIsNoneToMigrate) {
  EXPECT_FALSE(ASSAccountsManager::accountSettingsNeedsToBeMigrated());
  device.writeSettingsBytes("bplist00 no more");
  EXPECT_FALSE(ASSAccountsManager::accountSettingsNeedsToBeMigrated());
  device.writeSettingsBytes("<plist version=\"1.0\"><array/></plist>");
  EXPECT_FALSE(ASSAccountsManager::accountSettingsNeedsToBeMigrated());
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(LegacySettings, ASettingsFileWithoutAVersionIsNoneToMigrateAndSaysSo) {
  device.writeSettings({{"Accounts", Array{}}});
  EXPECT_FALSE(ASSAccountsManager::accountSettingsNeedsToBeMigrated());
  EXPECT_EQ(device.logLines(), (Lines{kNoVersion}));
}

TEST_F(LegacySettings, AnOlderVersionIsToBeMigrated) {
  writeVersion(11);
  EXPECT_TRUE(ASSAccountsManager::accountSettingsNeedsToBeMigrated());
  writeVersion(0);
  EXPECT_TRUE(ASSAccountsManager::accountSettingsNeedsToBeMigrated());
  EXPECT_EQ(device.logLines(),
            (Lines{kElevenIsOld,
                   "Account Settings Version out of date: savedVersion=0, currentVersion=12"}));
}

TEST_F(LegacySettings, TheCurrentANewerAndANegativeVersionAreNot) {
  for (const int version : {12, 13, -1}) {
    writeVersion(version);
    EXPECT_FALSE(ASSAccountsManager::accountSettingsNeedsToBeMigrated()) << version;
  }
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(LegacySettings, EveryFlagMustBeGivenBeforeAnyFileIsLookedAt) {
  const auto expectFailure = [](bool* first, bool* second, bool* third, const std::string& text,
                                int line) {
    try {
      ASSAccountsManager::shouldMigrateOldMailAccountsOldDAAccountsNewAccountSettings(first, second,
                                                                                      third);
      ADD_FAILURE() << "nothing was raised";
    } catch (const platform::InternalConsistencyFailure& failure) {
      EXPECT_EQ(failure.what(), text);
      EXPECT_EQ(failure.sourceFile(), "ASSAccountsManager");
      EXPECT_EQ(failure.line(), line);
    }
  };
  expectFailure(nullptr, nullptr, nullptr, "migrateOldMailAccounts cannot be nil", 1112);
  expectFailure(&mail, nullptr, nullptr, "migrateOldDAAccounts cannot be nil", 1113);
  expectFailure(&mail, &da, nullptr, "migrateNewAccounts cannot be nil", 1114);
  EXPECT_EQ(device.userDatabase.calls(), CallJournal());
  EXPECT_TRUE(mail && da && newAccounts);
}

TEST_F(LegacySettings, WithNothingToMigrateEveryFlagIsWrittenFalseWithoutALine) {
  writeVersion(12);
  EXPECT_EQ(decision(), "0 0 0");
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(LegacySettings, AnOutdatedVersionSetsTheThirdFlagAlone) {
  writeVersion(11);
  EXPECT_EQ(decision(), "0 0 1");
  EXPECT_EQ(device.logLines(), (Lines{kElevenIsOld, summary("0", "0", &newAccounts)}));
}

TEST_F(LegacySettings, AMailFileHidesTheVersion) {
  makeFile(mailAccountsPath());
  writeVersion(7);
  EXPECT_EQ(decision(), "1 0 0");
  EXPECT_EQ(device.logLines(), (Lines{summary("1", "0", &newAccounts)}));
}

TEST_F(LegacySettings, ADataAccessFileHidesAMissingVersion) {
  makeFile(daAccountPath());
  device.writeSettings({{"Accounts", Array{}}});
  EXPECT_EQ(decision(), "0 1 0");
  EXPECT_EQ(device.logLines(), (Lines{summary("0", "1", &newAccounts)}));
}

TEST_F(LegacySettings, BothLegacyFilesSetBothFlags) {
  makeFile(mailAccountsPath());
  makeFile(daAccountPath());
  EXPECT_EQ(decision(), "1 1 0");
  EXPECT_EQ(device.logLines(), (Lines{summary("1", "1", &newAccounts)}));
}

TEST_F(LegacySettings, RemovingTheSettingsFileRemovesItAndNeedsNone) {
  writeVersion(11);
  ASSAccountsManager::removeNewAccountSettingsToMigrateOldAccountInformation();
  EXPECT_EQ(device.readSettingsBytes(), std::nullopt);
  ASSAccountsManager::removeNewAccountSettingsToMigrateOldAccountInformation();
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(LegacySettings, AFailedRemovalIsLogged) {
  class Files : public platform::ForwardingFileServices {
   public:
    using ForwardingFileServices::ForwardingFileServices;
    platform::Status removeFile(const std::string&) override {
      return platform::Status::failure(EPERM, "Operation not permitted");
    }
  };
  writeVersion(11);
  Files files(device.fileServices);
  device.use<platform::FileServices>(files);
  ASSAccountsManager::removeNewAccountSettingsToMigrateOldAccountInformation();
  EXPECT_EQ(device.logLines(),
            (Lines{"[+[ASSAccountsManager(MigrationSupport) "
                   "removeNewAccountSettingsToMigrateOldAccountInformation]] Could not remove " +
                   device.settingsPath() + ". Error Operation not permitted"}));
}

TEST_F(LegacySettings, WithNothingToMigrateNoLockIsTaken) {
  writeVersion(12);
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(device.fileLock.calls(), CallJournal());
  EXPECT_EQ(migrator.made, 0);
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(LegacySettings, AnOutdatedFileIsMigratedOnceWithoutBeingRemoved) {
  writeVersion(11);
  bool wasThere = false;
  bool wasLocked = false;
  migrator.work = [&] {
    wasThere = device.readSettingsBytes().has_value();
    wasLocked = device.fileLock.isHeld("AccountMigrationInProgress");
  };
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_TRUE(wasThere);
  EXPECT_TRUE(wasLocked);
  EXPECT_EQ(migrator.made, 1);
  EXPECT_EQ(migrator.ran, 1);
  EXPECT_EQ(migrator.dropped, 1);
  EXPECT_EQ(device.fileLock.calls(), (CallJournal{"lockByName(AccountMigrationInProgress)",
                                                  "unlock(AccountMigrationInProgress)"}));
  EXPECT_EQ(linesWithoutAddresses(),
            (Lines{kElevenIsOld, found("0", "0"), kElevenIsOld, found("0", "0")}));
}

TEST_F(LegacySettings, WithALegacyFileTheSettingsFileGoesBeforeTheMigratorComes) {
  makeFile(mailAccountsPath());
  writeVersion(12);
  bool wasThere = true;
  migrator.work = [&] { wasThere = device.readSettingsBytes().has_value(); };
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_FALSE(wasThere);
  EXPECT_EQ(migrator.ran, 1);
  EXPECT_EQ(contentOf(mailAccountsPath()), "legacy");
  EXPECT_EQ(linesWithoutAddresses(), (Lines{found("1", "0"), found("1", "0")}));
}

TEST_F(LegacySettings, WithADataAccessFileToo) {
  makeFile(daAccountPath());
  writeVersion(12);
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(device.readSettingsBytes(), std::nullopt);
  EXPECT_EQ(migrator.ran, 1);
  EXPECT_EQ(contentOf(daAccountPath()), "legacy");
  EXPECT_EQ(linesWithoutAddresses(), (Lines{found("0", "1"), found("0", "1")}));
}

TEST_F(LegacySettings, ASecondAttemptInOneProcessDoesNothingAlsoAfterAFailedOne) {
  writeVersion(11);
  migrator.answer = false;
  ASSAccountsManager::_migrateAccountsIfNeeded();
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(migrator.ran, 1);
  EXPECT_EQ(linesWithoutAddresses(),
            (Lines{kElevenIsOld, found("0", "0"), kElevenIsOld, found("0", "0"), kFailed}));
}

TEST_F(LegacySettings, ASecondAttemptInOneProcessDoesNothingAlsoAfterANeedlessOne) {
  writeVersion(12);
  ASSAccountsManager::_migrateAccountsIfNeeded();
  writeVersion(11);
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(migrator.ran, 0);
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(LegacySettings, WithoutALockNothingFurtherHappens) {
  makeFile(mailAccountsPath());
  writeVersion(12);
  device.fileLock.failNext("lockByName");
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(migrator.made, 0);
  EXPECT_NE(device.readSettingsBytes(), std::nullopt);
  EXPECT_EQ(device.fileLock.calls(), (CallJournal{"lockByName(AccountMigrationInProgress)"}));
  EXPECT_EQ(linesWithoutAddresses(), (Lines{found("1", "0")}));
  ASSAccountsManager::_migrateAccountsIfNeeded();  // this was the process's one attempt
  EXPECT_EQ(linesWithoutAddresses(), (Lines{found("1", "0")}));
}

TEST_F(LegacySettings, TheOneAttemptCountsFromItsBeginning) {
  writeVersion(11);
  migrator.work = [] { ASSAccountsManager::_migrateAccountsIfNeeded(); };
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(migrator.ran, 1);
}

TEST_F(LegacySettings, EachProcessMigratesAgainWhileALegacyFileIsThere) {
  makeFile(mailAccountsPath());
  writeVersion(12);
  device.fileLock.decideBy([&](const std::string& call) {
    if (call.starts_with("lockByName")) writeVersion(12);  // another process has just built it
    return std::nullopt;
  });
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(device.readSettingsBytes(), std::nullopt);
  EXPECT_EQ(migrator.ran, 1);
}

TEST_F(LegacySettings, ABundleThatCannotBeLoadedIsLogged) {
  writeVersion(11);
  device.classRegistry.bundles.clear();
  std::filesystem::create_directories(_bundlePath());
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(linesWithoutAddresses(),
            (Lines{kElevenIsOld, found("0", "0"), kElevenIsOld, found("0", "0"), kFailed}));
}

TEST_F(LegacySettings, AClassOfTheNameThatIsNoMigratorIsLogged) {
  class Stranger : public platform::RuntimeClass {
    std::string className() const override { return "AccountsDataMigrator"; }
  } stranger;
  writeVersion(11);
  device.classRegistry.bundles[_bundlePath()] = {{&stranger}, std::nullopt};
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(linesWithoutAddresses().back(), kFailed);
}

TEST_F(LegacySettings, WhatAnotherProcessMigratedMeanwhileIsNotMigratedAgain) {
  writeVersion(11);
  device.fileLock.decideBy([&](const std::string& call) {
    if (call.starts_with("lockByName")) writeVersion(12);
    return std::nullopt;
  });
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(migrator.made, 0);
  EXPECT_FALSE(device.fileLock.isHeld("AccountMigrationInProgress"));
  EXPECT_EQ(linesWithoutAddresses(), (Lines{kElevenIsOld, found("0", "0")}));
}

// What the first decision found must not be acted on: with the lock in hand only the second counts.
TEST_F(LegacySettings, ALegacyFileThatAnotherProcessMovedAwayMeanwhileRemovesNothing) {
  makeFile(mailAccountsPath());
  writeVersion(11);
  device.fileLock.decideBy([&](const std::string& call) {
    if (call.starts_with("lockByName")) {
      std::filesystem::remove(mailAccountsPath());
      writeVersion(12);
    }
    return std::nullopt;
  });
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_NE(device.readSettingsBytes(), std::nullopt);
  EXPECT_EQ(migrator.made, 0);
  EXPECT_FALSE(device.fileLock.isHeld("AccountMigrationInProgress"));
  EXPECT_EQ(linesWithoutAddresses(), (Lines{found("1", "0")}));
}

TEST_F(LegacySettings, AMigratorThatCannotBeMadeIsLogged) {
  writeVersion(11);
  migrator.makesNone = true;
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(migrator.made, 1);
  EXPECT_EQ(migrator.ran, 0);
  EXPECT_FALSE(device.fileLock.isHeld("AccountMigrationInProgress"));
  EXPECT_EQ(linesWithoutAddresses(),
            (Lines{kElevenIsOld, found("0", "0"), kElevenIsOld, found("0", "0"), kFailed}));
}

TEST_F(LegacySettings, ABundleWithoutTheMigratorsClassIsLogged) {
  writeVersion(11);
  device.classRegistry.bundles[_bundlePath()] = {{}, std::nullopt};
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_FALSE(device.fileLock.isHeld("AccountMigrationInProgress"));
  EXPECT_EQ(linesWithoutAddresses(),
            (Lines{kElevenIsOld, found("0", "0"), kElevenIsOld, found("0", "0"), kFailed}));
}

TEST_F(LegacySettings, WithoutTheMigratorsBundleNothingIsSaidAndTheFileStaysRemoved) {
  device.classRegistry.bundles.clear();
  makeFile(mailAccountsPath());
  writeVersion(12);
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(device.readSettingsBytes(), std::nullopt);
  EXPECT_FALSE(device.fileLock.isHeld("AccountMigrationInProgress"));
  EXPECT_EQ(linesWithoutAddresses(), (Lines{found("1", "0"), found("1", "0")}));
}

TEST_F(LegacySettings, TheLockIsReleasedWhenTheMigratorRaises) {
  writeVersion(11);
  migrator.work = [] { throw platform::InternalConsistencyFailure("broken", "Migrator", 1); };
  EXPECT_THROW(ASSAccountsManager::_migrateAccountsIfNeeded(),
               platform::InternalConsistencyFailure);
  EXPECT_FALSE(device.fileLock.isHeld("AccountMigrationInProgress"));
  EXPECT_EQ(migrator.dropped, 1);
  ASSAccountsManager::_migrateAccountsIfNeeded();
  EXPECT_EQ(migrator.made, 1);
}

TEST_F(LegacySettings, AreNotAskedForByAStoreThatIsMade) {
  makeFile(mailAccountsPath());
  writeVersion(7);
  const AccountsManagerPtr store = ASSAccountsManager::init();
  EXPECT_EQ(store->dataVersion(), 7);
  store->saveAllAccounts();
  EXPECT_EQ(device.readSettings().find("Version")->asInteger(), 12);
  EXPECT_EQ(device.fileLock.calls(), CallJournal());
  EXPECT_EQ(device.logLines(), Lines());
}

}  // namespace
}  // namespace accountsettings
