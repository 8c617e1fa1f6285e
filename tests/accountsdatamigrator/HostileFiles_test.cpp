// Legacy files that no migration can be made from.
#include <filesystem>

#include "propertylist/Reading.h"
#include "tests/accountsdatamigrator/LegacyImage.h"

namespace accountsdatamigrator {
namespace {

using HostileFiles = LegacyTest;

TEST_F(HostileFiles, AreLoggedAndNothingIsWritten) {
  std::size_t count = 0;
  for (const auto& file : std::filesystem::directory_iterator(TEST_DATA_DIR "/malformed")) {
    const auto read = propertylist::readPropertyListFile(file.path());
    if (file.path().extension() != ".plist" || (read.value && read.value->asDictionary())) continue;
    SCOPED_TRACE(file.path().filename());
    ++count;
    for (const char* target : {kMailFile, kDataAccessFile}) {
      std::filesystem::create_directories(image.path(target).parent_path());
      std::filesystem::copy_file(file.path(), image.path(target));
      const auto before = bytesOf(target);
      const std::size_t lines = log().size();
      EXPECT_FALSE(execute());
      ASSERT_EQ(log().size(), lines + 1);
      EXPECT_THAT(log().back(), testing::StartsWith("AccountMigrator: IMAGE/" +
                                                    std::string(target) + " cannot be read: "));
      EXPECT_EQ(bytesOf(target), before);
      EXPECT_EQ(bytesOf(kSettingsFile), std::nullopt);
      EXPECT_EQ(temporaryFiles(), Lines());
      std::filesystem::remove(image.path(target));
    }
  }
  EXPECT_GT(count, 50U);
}

TEST_F(HostileFiles, OneOfThemLeavesTheOtherFilesAccountsUnwrittenToo) {
  write(kMailFile, {{"MailAccounts", Array{Dictionary{{"Class", "IMAPAccount"}}}}});
  writeBytes(kDataAccessFile, "rubbish");
  migrate();
  EXPECT_EQ(log().back(), kFailed);
  EXPECT_EQ(bytesOf(kSettingsFile), std::nullopt);
}

TEST_F(HostileFiles, AListThatIsNoneFailsTheMigration) {
  write(kMailFile, {{"MailAccounts", Dictionary()}});
  migrate();
  EXPECT_THAT(log(), testing::Contains("AccountMigrator: IMAGE/" + std::string(kMailFile) +
                                       ": \"MailAccounts\" is no array"));
  EXPECT_EQ(log().back(), kFailed);
}

TEST_F(HostileFiles, AFolderInAFilesPlaceFailsTheMigration) {
  std::filesystem::create_directories(image.path(kMailFile));
  migrate();
  EXPECT_EQ(log().back(), kFailed);
  EXPECT_TRUE(std::filesystem::is_directory(image.path(kMailFile)));
}

TEST_F(HostileFiles, ASettingsFileThatCannotBeWrittenFailsTheMigration) {
  write(kMailFile, {{"MailAccounts", Array()}});
  std::filesystem::remove(image.path("etc/passwd"));
  migrate();
  EXPECT_THAT(log(), testing::Contains("AccountMigrator: IMAGE/" + std::string(kSettingsFile) +
                                       " could not be written"));
  EXPECT_EQ(log().back(), kFailed);
  EXPECT_EQ(temporaryFiles(), Lines());
}

TEST_F(HostileFiles, ABundleWithoutItsCatalogueFailsTheMigration) {
  installServices(std::nullopt);
  std::filesystem::remove(
      image.path("System/Library/DataClassMigrators/AccountMigrator.migrator/"
                 "AccountTypesProperties.plist"));
  write(kMailFile, {{"MailAccounts", Array()}});
  migrate();
  EXPECT_THAT(log(),
              testing::Contains("AccountMigrator: AccountTypesProperties.plist is not beside "
                                "the code"));
  EXPECT_EQ(log().back(), kFailed);
}

}  // namespace
}  // namespace accountsdatamigrator
