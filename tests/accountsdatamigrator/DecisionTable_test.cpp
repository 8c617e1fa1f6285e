// Each row of the table by which the library decides, with the real migrator and all that is
// logged.
#include <filesystem>

#include "tests/accountsdatamigrator/LegacyImage.h"

namespace accountsdatamigrator {
namespace {

constexpr const char* kOutdated =
    "Account Settings Version out of date: savedVersion=11, currentVersion=12";

std::string needs(int mail, int dataAccess) {
  return "Accounts settings needs migration! oldMailAccountsPresent=" + std::to_string(mail) +
         ", oldDAAccountsPresent=" + std::to_string(dataAccess) +
         ", migrateNewAccountsInfo=ADDRESS";
}

std::string built(const std::string& count) {
  return "AccountMigrator: built IMAGE/" + std::string(kSettingsFile) + " with " + count +
         " accounts";
}

Dictionary entry(const std::string& className, const std::string& identifier) {
  return {{"Class", className}, {"UniqueIdentifier", identifier}};
}

class DecisionTable : public LegacyTest {
 protected:
  void writeMail() const {
    write(kMailFile, {{"MailAccounts", Array{entry("IMAPAccount", "M1")}}});
  }
  void writeDataAccess() const {
    write(kDataAccessFile, {{"Accounts", Array{entry("CalDAVAccount", "D1")}}});
  }
  void writeSettings(int version) const {
    write(
        kSettingsFile,
        {{"Version", version},
         {"Accounts", Array{Dictionary{{"Identifier", "S1"}, {"Type", "LDAP"}, {"Class", "C"}}}}});
  }
  Lines identifiers() const {
    Lines found;
    for (const propertylist::Value& account : accounts())
      found.push_back(*propertylist::findString(*account.asDictionary(), "Identifier"));
    return found;
  }
  bool lockFileExists() const {
    return std::filesystem::exists(image.path("tmp/AccountMigrationInProgress"));
  }
};

TEST_F(DecisionTable, WithNothingOldNothingHappens) {
  writeSettings(12);
  const auto before = bytesOf(kSettingsFile);
  migrate();
  EXPECT_EQ(log(), Lines());
  EXPECT_EQ(bytesOf(kSettingsFile), before);
  EXPECT_FALSE(lockFileExists());
}

TEST_F(DecisionTable, WithoutASettingsFileNothingHappens) {
  migrate();
  EXPECT_EQ(log(), Lines());
  EXPECT_EQ(bytesOf(kSettingsFile), std::nullopt);
  EXPECT_FALSE(lockFileExists());
}

TEST_F(DecisionTable, ANegativeVersionCountsAsNewer) {
  writeSettings(-1);
  const auto before = bytesOf(kSettingsFile);
  migrate();
  EXPECT_EQ(log(), Lines());
  EXPECT_EQ(bytesOf(kSettingsFile), before);
  EXPECT_FALSE(lockFileExists());
}

TEST_F(DecisionTable, AMissingVersionIsSaidAndNotMigrated) {
  write(kSettingsFile, {{"Accounts", Array()}});
  const auto before = bytesOf(kSettingsFile);
  migrate();
  EXPECT_EQ(log(), (Lines{"Account Settings plist is missing a version number, returning NO for "
                          "migration"}));
  EXPECT_EQ(bytesOf(kSettingsFile), before);
  EXPECT_FALSE(lockFileExists());
}

TEST_F(DecisionTable, AMailFileHidesAMissingVersion) {
  writeMail();
  write(kSettingsFile, {{"Accounts", Array()}});
  migrate();
  EXPECT_EQ(log(), (Lines{needs(1, 0), needs(1, 0), built("1")}));
  EXPECT_EQ(identifiers(), Lines{"M1"});
}

TEST_F(DecisionTable, ANewerVersionIsLeftAlone) {
  writeSettings(13);
  const auto before = bytesOf(kSettingsFile);
  migrate();
  EXPECT_EQ(log(), Lines());
  EXPECT_EQ(bytesOf(kSettingsFile), before);
  EXPECT_FALSE(lockFileExists());
}

TEST_F(DecisionTable, UnreadableSettingsAreLeftAlone) {
  writeBytes(kSettingsFile, "rubbish");
  migrate();
  EXPECT_EQ(log(), Lines());
  EXPECT_EQ(bytesOf(kSettingsFile), "rubbish");
  EXPECT_FALSE(lockFileExists());
}

TEST_F(DecisionTable, AnOutdatedVersionIsBroughtUpToDate) {
  writeSettings(11);
  migrate();
  EXPECT_EQ(log(), (Lines{kOutdated, needs(0, 0), kOutdated, needs(0, 0),
                          "AccountMigrator: brought IMAGE/" + std::string(kSettingsFile) +
                              " to version 12"}));
  EXPECT_EQ(*settings().find("Version"), propertylist::Value(12));
  EXPECT_EQ(identifiers(), Lines{"S1"});
}

TEST_F(DecisionTable, AMailFileReplacesTheSettings) {
  writeMail();
  writeSettings(11);
  migrate();
  EXPECT_EQ(log(), (Lines{needs(1, 0), needs(1, 0), built("1")}));
  EXPECT_EQ(identifiers(), Lines{"M1"});
}

TEST_F(DecisionTable, DataAccessPreferencesReplaceTheSettings) {
  writeDataAccess();
  writeSettings(12);
  migrate();
  EXPECT_EQ(log(), (Lines{needs(0, 1), needs(0, 1), built("1")}));
  EXPECT_EQ(identifiers(), Lines{"D1"});
}

TEST_F(DecisionTable, BothLegacyFilesGoIntoOneSettingsFile) {
  writeMail();
  writeDataAccess();
  migrate();
  EXPECT_EQ(log(), (Lines{needs(1, 1), needs(1, 1), built("2")}));
  EXPECT_EQ(identifiers(), (Lines{"M1", "D1"}));
}

TEST_F(DecisionTable, ASecondCallInOneProcessDoesNothing) {
  writeMail();
  migrate();
  std::filesystem::remove(image.path(kSettingsFile));
  const Lines before = log();
  migrate();
  EXPECT_EQ(log(), before);
  EXPECT_EQ(bytesOf(kSettingsFile), std::nullopt);
}

TEST_F(DecisionTable, WhatWasMigratedIsLoadedAndSavedByTheLibrary) {
  writeMail();
  writeDataAccess();
  migrate();
  ASSAccountsManager::init()->saveAllAccounts();
  EXPECT_EQ(identifiers(), (Lines{"M1", "D1"}));
  EXPECT_FALSE(ASSAccountsManager::accountSettingsNeedsToBeMigrated());
}

}  // namespace
}  // namespace accountsdatamigrator
