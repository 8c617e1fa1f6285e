// Legacy files that no migration can be made from.
#include <filesystem>
#include <set>

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

std::set<std::string> identifiersOf(const Array& accounts) {
  std::set<std::string> found;
  for (const propertylist::Value& account : accounts)
    found.insert(*propertylist::findString(*account.asDictionary(), "Identifier"));
  return found;
}

TEST_F(HostileFiles, WithVeryManyEqualEntriesAreBuiltFrom) {
  constexpr std::size_t kCount = 20'000;
  const Dictionary entry = {{"Class", "IMAPAccount"}};
  write(kMailFile, {{"MailAccounts", Array(std::vector<propertylist::Value>(kCount, entry))}});
  ASSERT_TRUE(execute());
  EXPECT_EQ(identifiersOf(accounts()).size(), kCount);
}

TEST_F(HostileFiles, WithALongTextThatManyEntriesShareAreBuiltFrom) {
  constexpr int kCount = 20'000;
  const propertylist::Value shared = std::string(4'000'000, 'u');
  std::vector<propertylist::Value> entries;
  for (int port = 0; port < kCount; ++port)
    entries.push_back(Dictionary{{"Class", "IMAPAccount"}, {"Username", shared}, {"Port", port}});
  write(kMailFile, {{"MailAccounts", Array(std::move(entries))}});
  ASSERT_TRUE(execute());
  EXPECT_EQ(identifiersOf(accounts()).size(), std::size_t{kCount});
}

TEST_F(HostileFiles, GetABoundedNumberOfLines) {
  const propertylist::Value shared = std::string(4'000'000, 'c');
  const Dictionary unknown = {{"Class", shared}};
  const Dictionary odd = {{"Class", "IMAPAccount"},
                          {"Dataclasses", Array(std::vector<propertylist::Value>(300, shared))}};
  std::vector<propertylist::Value> entries(20'000, unknown);
  entries.insert(entries.end(), 100, odd);
  write(kMailFile, {{"MailAccounts", Array(std::move(entries))}});
  ASSERT_TRUE(execute());
  ASSERT_EQ(log().size(), 102U);
  EXPECT_EQ(log()[100], "AccountMigrator: IMAGE/" + std::string(kMailFile) +
                            ": \"MailAccounts\": and 49900 more of such lines");
  EXPECT_EQ(accounts().size(), 100U);
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
