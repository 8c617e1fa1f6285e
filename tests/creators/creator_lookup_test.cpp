#include <gmock/gmock.h>

#include "tests/creators/CreatorsDevice.h"

namespace accountsettings {
namespace {

constexpr const char* kSourceFile = "ASSBasicAccount";

class CreatorLookup : public testing::Test {
 protected:
  CreatorsDevice device;
};

TEST_F(CreatorLookup, ReadsTheCatalogueOncePerProcess) {
  device.setCreators({{"CalDAV", Array{}}});
  EXPECT_EQ(CreatingAccount::_accountCreationMap(), (Dictionary{{"CalDAV", Array{}}}));
  device.setCreators({{"Mail", Array{}}});
  EXPECT_EQ(CreatingAccount::_accountCreationMap(), (Dictionary{{"CalDAV", Array{}}}));
  EXPECT_EQ(CreatingAccount::_creatorsInfo(), (Dictionary{{"Mail", Array{}}}));
}

TEST_F(CreatorLookup, ReadsNothingFromAMissingOrUnreadableCatalogueAndSaysNothing) {
  EXPECT_EQ(CreatingAccount::_creatorsInfo(), std::nullopt);
  device.setResourceBytes("AccountCreators", "no property list");
  EXPECT_EQ(CreatingAccount::_creatorsInfo(), std::nullopt);
  device.setResource("AccountCreators", Array{});
  EXPECT_EQ(CreatingAccount::_creatorsInfo(), std::nullopt);
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(CreatorLookup, FindsNoCreatorsForAnyTypeWithoutACatalogueForTheWholeProcess) {
  const auto account = calendarAccount();
  for (const char* type : {"CalDAV", "Mail", "OnMyDevice"}) {
    expectAssertionFailure(
        std::string("Malformed AccountCreators information. Could not find the information for "
                    "the type ") +
            type,
        kSourceFile,
        [&] { account->fullAccountCreatorClassNameForAccountTypeLoader(type, nullptr); });
  }
  device.setCreators({{"CalDAV", Array{}}});
  EXPECT_EQ(CreatingAccount::_accountCreationMap(), std::nullopt);
}

TEST_F(CreatorLookup, NeedsAListForTheType) {
  device.setCreators({{"Mail", Array{}}});
  const auto account = calendarAccount();
  expectAssertionFailure(
      "Malformed AccountCreators information. Could not find the information for the type CalDAV",
      kSourceFile, [&] { account->syncAccountCreatorClassNameForAccountType("CalDAV"); });
}

TEST_F(CreatorLookup, NamesAMissingTypeAsSuch) {
  device.setCreators({{"Mail", Array{}}});
  const std::string text =
      "Malformed AccountCreators information. Could not find the information for the type (null)";
  const auto account = calendarAccount();
  account->removeAccountPropertyForKey("Type");
  expectAssertionFailure(text, kSourceFile, [&] { account->fullAccountUsingLoader(nullptr); });
  expectAssertionFailure(text, kSourceFile, [&] { account->_cachedSyncAccount(); });
}

TEST_F(CreatorLookup, LoadsEveryMatchingBundleAndAnswersTheLastClass) {
  device.setCreators({{"CalDAV", Array{creator("SyncAccount", kFullAccounts, "First"),
                                       creator("SyncAccount", kSyncAccounts, "Second")}}});
  EXPECT_EQ(calendarAccount()->syncAccountCreatorClassNameForAccountType("CalDAV"), "Second");
  EXPECT_TRUE(fullAccountsAreLoaded());
  EXPECT_TRUE(syncAccountsAreLoaded());
}

TEST_F(CreatorLookup, SkipsEntriesOfOtherKindsWithoutACheck) {
  device.setCreators({{"CalDAV", Array{Dictionary{{"Type", "SyncAccount"}}, Dictionary{},
                                       creator("SyncAccount", kSyncAccounts, ""),
                                       creator("FullAccount", kFullAccounts, "MakingCreator")}}});
  EXPECT_EQ(calendarAccount()->fullAccountCreatorClassNameForAccountTypeLoader("CalDAV", nullptr),
            "MakingCreator");
  EXPECT_FALSE(syncAccountsAreLoaded());
}

TEST_F(CreatorLookup, AnswersNothingWhereNoEntryMatches) {
  device.setCreators(
      {{"CalDAV", Array{creator("FullAccount", kUnresolved, "MakingCreator")}}, {"Mail", Array{}}});
  EXPECT_EQ(calendarAccount()->syncAccountCreatorClassNameForAccountType("CalDAV"), std::nullopt);
  EXPECT_EQ(calendarAccount()->syncAccountCreatorClassNameForAccountType("Mail"), std::nullopt);
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(CreatorLookup, SaysWhatIsMissingFromAMatchingEntry) {
  device.setCreators({{"CalDAV", Array{Dictionary{{"Type", "FullAccount"}}}},
                      {"CardDAV", Array{entry("SyncAccount", {{"Class", "SyncCreator"}})}},
                      {"LDAP", Array{entry("FullAccount", {{"Framework", kFullAccounts}})}},
                      {"SMTP", Array{creator("FullAccount", kFullAccounts, "")}}});
  const auto account = calendarAccount();
  expectAssertionFailure(
      "Malformed AccountCreators information. Could not find the description for the FullAccount "
      "with type CalDAV",
      kSourceFile,
      [&] { account->fullAccountCreatorClassNameForAccountTypeLoader("CalDAV", nullptr); });
  expectAssertionFailure(
      "Malformed AccountCreators information. Could not find the path to the framework for the "
      "SyncAccount with type CardDAV",
      kSourceFile, [&] { account->syncAccountCreatorClassNameForAccountType("CardDAV"); });
  for (const char* type : {"LDAP", "SMTP"}) {
    expectAssertionFailure(
        std::string("Malformed AccountCreators information. Could not find the name of the class "
                    "that creates FullAccount with the type ") +
            type,
        kSourceFile,
        [&] { account->fullAccountCreatorClassNameForAccountTypeLoader(type, nullptr); });
  }
}

TEST_F(CreatorLookup, ChecksTheClassAfterTheBundleWasLoaded) {
  device.setCreators({{"CalDAV", Array{creator("FullAccount", kFullAccounts, "")}}});
  ASSERT_FALSE(fullAccountsAreLoaded());
  EXPECT_THROW(
      calendarAccount()->fullAccountCreatorClassNameForAccountTypeLoader("CalDAV", nullptr),
      platform::InternalConsistencyFailure);
  EXPECT_TRUE(fullAccountsAreLoaded());
}

TEST_F(CreatorLookup, AMalformedLaterEntryCountsAlthoughAnEarlierOneMatched) {
  device.setCreators({{"CalDAV", Array{creator("SyncAccount", kSyncAccounts, "SyncCreator"),
                                       Dictionary{{"Type", "SyncAccount"}}}}});
  expectAssertionFailure(
      "Malformed AccountCreators information. Could not find the description for the SyncAccount "
      "with type CalDAV",
      kSourceFile, [&] { calendarAccount()->syncAccountCreatorClassNameForAccountType("CalDAV"); });
  EXPECT_TRUE(syncAccountsAreLoaded());
}

TEST_F(CreatorLookup, ALoaderThatLoadedTheCodeMakesTheFrameworkNeedless) {
  device.setCreators({{"CalDAV", Array{entry("FullAccount", {{"Class", "First"}}),
                                       creator("FullAccount", kFullAccounts, "Second")}}});
  NotingLoader loader(true);
  EXPECT_EQ(
      calendarAccount("a")->fullAccountCreatorClassNameForAccountTypeLoader("CalDAV", &loader),
      "Second");
  EXPECT_EQ(loader.asked, (Lines{"a", "a"}));
  EXPECT_FALSE(fullAccountsAreLoaded());
  // Each record hands over its own properties.
  calendarAccount("b")->fullAccountCreatorClassNameForAccountTypeLoader("CalDAV", &loader);
  EXPECT_EQ(loader.asked, (Lines{"a", "a", "b", "b"}));
}

TEST_F(CreatorLookup, ALoaderThatLoadedNothingLeavesTheFrameworkNeeded) {
  device.setCreators({{"CalDAV", Array{creator("FullAccount", kFullAccounts, "MakingCreator")}},
                      {"Mail", Array{entry("FullAccount", {{"Class", "MakingCreator"}})}}});
  NotingLoader loader(false);
  const auto account = calendarAccount();
  EXPECT_EQ(account->fullAccountCreatorClassNameForAccountTypeLoader("CalDAV", &loader),
            "MakingCreator");
  EXPECT_TRUE(fullAccountsAreLoaded());
  EXPECT_EQ(loader.asked, Lines{"1"});
  expectAssertionFailure(
      "Malformed AccountCreators information. Could not find the path to the framework for the "
      "FullAccount with type Mail",
      kSourceFile,
      [&] { account->fullAccountCreatorClassNameForAccountTypeLoader("Mail", &loader); });
}

TEST_F(CreatorLookup, NeverAsksTheLoaderForASyncAccount) {
  device.setCreators({{"CalDAV", Array{creator("SyncAccount", kSyncAccounts, "SyncCreator")}}});
  NotingLoader loader(true);
  EXPECT_EQ(calendarAccount()->_creatorClassNameForAccountTypeCreatorTypeLoader(
                "CalDAV", "SyncAccount", &loader),
            "SyncCreator");
  EXPECT_EQ(loader.asked, Lines{});
  EXPECT_TRUE(syncAccountsAreLoaded());
}

TEST_F(CreatorLookup, AFrameworkThatBeginsWithASlashStaysBelowTheRoot) {
  device.setCreators(
      {{"CalDAV", Array{creator("SyncAccount", std::string("/") + kSyncAccounts, "SyncCreator")}},
       {"Mail", Array{creator("SyncAccount", "/Library/Missing.so", "SyncCreator")}}});
  const auto account = calendarAccount();
  EXPECT_EQ(account->syncAccountCreatorClassNameForAccountType("CalDAV"), "SyncCreator");
  EXPECT_TRUE(syncAccountsAreLoaded());
  const std::string path = device.root() + "/Library/Missing.so";
  expectAssertionFailure("Could not load the account creator framework " + path + ". Error " +
                             path + ": cannot open shared object file: No such file or directory",
                         kSourceFile,
                         [&] { account->syncAccountCreatorClassNameForAccountType("Mail"); });
}

TEST_F(CreatorLookup, ABundleWithAnUnresolvedSymbolDoesNotLoad) {
  device.setCreators({{"CalDAV", Array{creator("FullAccount", kUnresolved, "MakingCreator")}}});
  const std::string path = device.bundlePath(kUnresolved);
  try {
    calendarAccount()->fullAccountUsingLoader(nullptr);
    ADD_FAILURE() << "nothing was raised";
  } catch (const platform::InternalConsistencyFailure& failure) {
    EXPECT_THAT(failure.what(),
                testing::StartsWith("Could not load the account creator framework " + path +
                                    ". Error " + path + ": "));
    EXPECT_THAT(failure.what(), testing::HasSubstr("a_function_that_nobody_defines"));
    EXPECT_EQ(failure.sourceFile(), kSourceFile);
  }
}

}  // namespace
}  // namespace accountsettings
