#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

const std::string kFailed =
    "[-[ASSAccountsManager _initWithAccountsInfo:]] ERROR: Failed to create a ASSBasicAccount "
    "from ";
const std::string kInvalidType = "[-[ASSBasicAccount initWithProperties:]] Invalid account type: ";
const std::string kMissingClass = "[-[ASSBasicAccount initWithProperties:]] Missing account class.";

class MalformedSettings : public ::testing::Test {
 protected:
  // Loads the sample as the settings file, and expects these accounts, this version and these log
  // lines; and that the accounts come out of a save as they went in.
  void expectLoads(const std::string& sample, const Lines& accounts, std::int64_t version,
                   const Lines& lines) {
    SCOPED_TRACE(sample);
    const AccountsManagerPtr store = load(sample);
    EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), accounts);
    EXPECT_EQ(store->dataVersion(), version);
    EXPECT_EQ(device.logLines(), lines);
    Array expected;
    for (const AccountPtr& account : *store->allBasicAccounts())
      expected.append(account->properties());
    store->saveAllAccounts();
    EXPECT_EQ(device.readSettings(), (Dictionary{{"Version", 12}, {"Accounts", expected}}));
    EXPECT_EQ(device.temporaryFiles(), Lines());
  }
  AccountsManagerPtr load(const std::string& sample) {
    std::ifstream file(std::string(TEST_DATA_DIR) + "/malformed/" + sample, std::fstream::binary);
    EXPECT_TRUE(file.is_open()) << sample;
    device.writeSettingsBytes(std::string(std::istreambuf_iterator<char>(file), {}));
    return ASSAccountsManager::init();
  }
  AccountsDevice device;
};

TEST_F(MalformedSettings, RootThatIsAStringGivesAnEmptyStoreAndIsSetAside) {
  expectLoads("s02_root_string.plist", {}, 0, {});
  EXPECT_TRUE(std::filesystem::exists(device.settingsPath() + ".unreadable-1"));
}

TEST_F(MalformedSettings, AccountsThatAreADictionaryCountAsAbsent) {
  expectLoads("s03_accounts_dict.plist", {}, 12, {});
}

TEST_F(MalformedSettings, EntriesThatAreNoDictionariesAreNamedAndSkipped) {
  expectLoads(
      "s05_accounts_mixed.plist", {"GOOD"}, 12,
      {kFailed + "1", kFailed + "x", kFailed + "({Class = C; Identifier = GOOD; Type = CalDAV})"});
}

TEST_F(MalformedSettings, TypeOrClassThatIsNoStringMakesNoAccount) {
  expectLoads("s06_type_not_string.plist", {"GOOD"}, 0,
              {kInvalidType + "7", kFailed + "{Class = C; Type = 7}", kInvalidType + "(CalDAV)",
               kFailed + "{Class = C; Type = (CalDAV)}", kInvalidType + "<43616c444156>",
               kFailed + "{Class = C; Type = <43616c444156>}", kMissingClass,
               kFailed + "{Class = 1; Type = CalDAV}"});
}

TEST_F(MalformedSettings, HostileIdentifiersAreIdentifiersLikeAnyOther) {
  const Lines identifiers = {"",
                             "../../../../etc/x",
                             "/etc/x",
                             "a/b",
                             std::string("a\0b", 3),
                             std::string(300, 'z'),
                             "id\nOct 10 host kernel: fake"};
  expectLoads("s08_identifier_hostile.plist", identifiers, 0, {});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  for (const std::string& identifier : identifiers) {
    ASSERT_NE(store->accountWithIdentifier(identifier), nullptr);
    EXPECT_EQ(store->accountWithIdentifier(identifier)->identifier(), identifier);
  }
}

TEST_F(MalformedSettings, ConversionsInValuesAreLoggedAsTheyStand) {
  expectLoads(
      "s09_format_string.plist", {"GOOD"}, 0,
      {kInvalidType + "%s%n%@",
       kFailed + "{Class = %s%s%s%n; DisplayName = %99999999d%@; Identifier = %n%n%@; Type = "
                 "%s%n%@}"});
}

TEST_F(MalformedSettings, AccountsThatShareAnIdentifierAreAllListedAndTheLaterFound) {
  const AccountsManagerPtr store = load("s11_duplicate_identifiers.plist");
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"GOOD", "GOOD"}));
  EXPECT_EQ(store->accountWithIdentifier("GOOD"), (*store->allBasicAccounts())[1]);
  EXPECT_EQ(identifiersOf(store->allBasicSyncableAccounts()), (Lines{"GOOD", "GOOD", "GOOD"}));
  EXPECT_EQ(device.logLines(), Lines());
  // A save finds what is on disk by the identifier, so what did not change in memory follows the
  // later account.
  store->saveAllAccounts();
  const Dictionary later = (*store->allBasicAccounts())[1]->properties();
  EXPECT_EQ(device.savedAccounts(), (Array{later, later}));
}

TEST_F(MalformedSettings, VersionMayBeAString) {
  expectLoads("s12_version_string.plist", {"GOOD"}, 12, {});
}

TEST_F(MalformedSettings, VersionMayBeNegative) {
  expectLoads("s14_version_negative.plist", {"GOOD"}, -1, {});
}

TEST_F(MalformedSettings, HugeRealVersionIsTheLargestInteger) {
  expectLoads("s15_version_real.plist", {"GOOD"}, INT64_MAX, {});
}

TEST_F(MalformedSettings, TwoThousandAccountsLoadAndSave) {
  Lines identifiers;
  for (int i = 0; i < 2000; ++i) {
    const std::string number = std::to_string(i);
    identifiers.push_back("I" + std::string(5 - number.size(), '0') + number);
  }
  expectLoads("s17_many_accounts.plist", identifiers, 12, {});
}

TEST_F(MalformedSettings, IdentifiersThatDifferInNormalisationAreTwoAccounts) {
  const std::string composed = "caf\u00e9";
  const std::string decomposed = "cafe\u0301";
  expectLoads("s18_normalisation.plist", {composed, decomposed}, 0, {});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  EXPECT_NE(store->accountWithIdentifier(composed), store->accountWithIdentifier(decomposed));
}

}  // namespace
}  // namespace accountsettings
