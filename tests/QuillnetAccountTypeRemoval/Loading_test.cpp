#include <gtest/gtest.h>

#include <filesystem>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr const char* kFailedToCreate =
    "[-[ASSAccountsManager _initWithAccountsInfo:]] ERROR: Failed to create a ASSBasicAccount "
    "from ";

class Loading : public ::testing::Test {
 protected:
  static void expectEmpty(const ASSAccountsManager& store) {
    EXPECT_EQ(store.count(), 0U);
    EXPECT_EQ(store.dataVersion(), 0);
  }
  AccountsDevice device;
};

TEST_F(Loading, FindsTheSettingsFileBelowTheSystemRoot) {
  const struct {
    const char* root;
    const char* path;
  } kCases[] = {
      {"/", "/var/mobile/Library/Preferences/com.vantor.accountsettings.plist"},
      {"/r", "/r/var/mobile/Library/Preferences/com.vantor.accountsettings.plist"},
      {"/r/", "/r/var/mobile/Library/Preferences/com.vantor.accountsettings.plist"},
      {"", "/var/mobile/Library/Preferences/com.vantor.accountsettings.plist"},
  };
  const std::string root = device.root();
  for (const auto& c : kCases) {
    device.deviceInfo.systemRoot = c.root;
    EXPECT_EQ(ASSAccountsManager::fullPathToAccountSettingsPlist(), c.path);
    EXPECT_EQ(accountSettingsAccountsPath(), c.path);
  }
  device.deviceInfo.systemRoot = root;
}

TEST_F(Loading, CurrentVersionIsTwelve) { EXPECT_EQ(ASSAccountsManager::currentVersion(), 12U); }

TEST_F(Loading, GivesTheAccountsInTheOrderOfTheFile) {
  device.writeAccounts(
      {accountInfo("b"), accountInfo("c", "Mail", {{"Class", "IMAPAccount"}}), accountInfo("a")});
  for (const AccountsManagerPtr& store :
       {ASSAccountsManager::init(), ASSAccountsManager::initInsideOfMigration()}) {
    EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"b", "c", "a"}));
    EXPECT_EQ(store->dataVersion(), 12);
    EXPECT_EQ(store->accountWithIdentifier("c")->accountClass(), "IMAPAccount");
  }
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(Loading, ReadsBothFormsAlike) {
  const Dictionary settings{
      {"Version", 7},
      {"Accounts", Array{accountInfo("1", "CalDAV", {{"n", 1}, {"yes", true}, {"half", 0.5}})}}};
  device.writeSettings(settings);
  const AccountsManagerPtr binary = ASSAccountsManager::init();
  device.writeSettingsBytes(*propertylist::writeXMLPropertyList(settings));
  const AccountsManagerPtr xml = ASSAccountsManager::init();
  EXPECT_EQ(xml->accountWithIdentifier("1")->properties(),
            accountInfo("1", "CalDAV", {{"n", 1}, {"yes", true}, {"half", 0.5}}));
  EXPECT_EQ(binary->accountWithIdentifier("1")->properties(),
            xml->accountWithIdentifier("1")->properties());
  EXPECT_EQ(binary->dataVersion(), 7);
  EXPECT_EQ(xml->dataVersion(), 7);
}

TEST_F(Loading, FileThatIsNoDictionaryGivesAnEmptyStoreWithoutAWord) {
  expectEmpty(*ASSAccountsManager::init());  // no file at all
  const std::string good = [&] {
    device.writeAccounts({accountInfo("1")});
    return *device.readSettingsBytes();
  }();
  for (const std::string& bytes :
       {std::string(), std::string("no property list"), good.substr(0, good.size() / 2),
        std::string("<plist><array/></plist>"), std::string("<plist><string>x</string></plist>")}) {
    SCOPED_TRACE(bytes);
    device.writeSettingsBytes(bytes);
    expectEmpty(*ASSAccountsManager::init());
  }
  std::filesystem::remove(device.settingsPath());
  std::filesystem::create_directory(device.settingsPath());
  expectEmpty(*ASSAccountsManager::init());
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(Loading, TakesTheVersionAsASignedNumber) {
  const struct {
    const char* name;
    Dictionary settings;
    std::int64_t version;
  } kCases[] = {
      {"seven", {{"Version", 7}, {"Accounts", Array()}}, 7},
      {"negative", {{"Version", -1}, {"Accounts", Array()}}, -1},
      {"none", {{"Accounts", Array()}}, 0},
      {"without accounts", {{"Version", 9}}, 9},
      {"accounts that are no array", {{"Version", 9}, {"Accounts", "x"}}, 9},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    device.writeSettings(c.settings);
    const AccountsManagerPtr store = ASSAccountsManager::init();
    EXPECT_EQ(store->dataVersion(), c.version);
    EXPECT_EQ(store->count(), 0U);
  }
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(Loading, ReadsTheFileOnceForEachStoreAndWithoutALock) {
  device.writeAccounts({accountInfo("1")});
  const AccountsManagerPtr before = ASSAccountsManager::init();
  const std::string reading = "readPropertyListFile(" + device.settingsPath();
  EXPECT_EQ(device.countOfFileCalls(reading), 1U);
  device.writeAccounts({accountInfo("1"), accountInfo("2")});
  const AccountsManagerPtr after = ASSAccountsManager::init();
  EXPECT_EQ(device.countOfFileCalls(reading), 2U);
  EXPECT_EQ(before->count(), 1U);
  EXPECT_EQ(after->count(), 2U);
  EXPECT_NE(before->accountWithIdentifier("1"), after->accountWithIdentifier("1"));
  EXPECT_TRUE(device.fileLock.calls().empty());
}

TEST_F(Loading, StoreOfAnArrayLeavesTheFileAlone) {
  device.writeAccounts({accountInfo("in the file")});
  const AccountsManagerPtr store =
      ASSAccountsManager::initWithAccounsInfoArray(Array{accountInfo("given")});
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"given"}));
  EXPECT_EQ(store->dataVersion(), 0);
  EXPECT_EQ(device.countOfFileCalls("readPropertyListFile(" + device.settingsPath()), 0U);
}

TEST_F(Loading, StoreOfNoAccountsIsEmptyWithAnEmptySnapshot) {
  expectEmpty(*ASSAccountsManager::initWithAccounsInfoArray(std::nullopt));
  const auto store = OpenStore::ofAccounts({});
  expectEmpty(*store);
  EXPECT_TRUE(store->originalAccountsByID().empty());
}

TEST_F(Loading, OnlyTheTypeOnMyDeviceGivesADeviceLocalAccount) {
  const auto store = OpenStore::ofAccounts({accountInfo("X", "OnMyDevice"), accountInfo("1")});
  EXPECT_EQ((*store->allBasicAccounts())[0]->className(), "ASSDeviceLocalAccount");
  EXPECT_EQ((*store->allBasicAccounts())[1]->className(), "ASSBasicAccount");
}

TEST_F(Loading, RegistersADeviceLocalAccountUnderItsFixedIdentifier) {
  const auto store = OpenStore::ofAccounts({accountInfo("X", "OnMyDevice")});
  EXPECT_EQ(store->accountWithIdentifier("DeviceLocalAccount"), (*store->allBasicAccounts())[0]);
  EXPECT_EQ(store->accountWithIdentifier("X"), nullptr);
  EXPECT_EQ(store->originalAccountsByID().at("DeviceLocalAccount"), accountInfo("X", "OnMyDevice"));
}

TEST_F(Loading, NamesEachEntryThatMakesNoAccountAndLoadsTheRest) {
  const auto store = OpenStore::ofAccounts(
      {Dictionary{{"Identifier", "1"}, {"Type", "Fax"}, {"Class", "C"}}, 7, "text",
       Array{accountInfo("hidden")}, Dictionary{{"Type", "OnMyDevice"}}, accountInfo("good")});
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"good"}));
  const std::string failed = kFailedToCreate;
  EXPECT_EQ(device.logLines(),
            (Lines{"[-[ASSBasicAccount initWithProperties:]] Invalid account type: Fax",
                   failed + "{Class = C; Identifier = 1; Type = Fax}", failed + "7",
                   failed + "text", failed + "({Class = C; Identifier = hidden; Type = CalDAV})",
                   "[-[ASSBasicAccount initWithProperties:]] Missing account class.",
                   failed + "{Type = OnMyDevice}"}));
}

TEST_F(Loading, ListsBothAccountsOfOneIdentifierAndFindsTheLater) {
  const auto store = OpenStore::ofAccounts(
      {accountInfo("1", "CalDAV", {{"n", 1}}), accountInfo("1", "CalDAV", {{"n", 2}})});
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"1", "1"}));
  EXPECT_EQ(store->accountWithIdentifier("1"), (*store->allBasicAccounts())[1]);
  EXPECT_EQ(*store->accountWithIdentifier("1")->accountPropertyForKey("n"), Value(2));
  EXPECT_EQ(store->originalAccountsByID().at("1"), accountInfo("1", "CalDAV", {{"n", 2}}));
}

TEST_F(Loading, AccountWithoutIdentifierIsListedAndNamedForWantOfASnapshot) {
  device.uuidGenerator.failEvery("generateUUID");
  const auto store =
      OpenStore::ofAccounts({Dictionary{{"Type", "CalDAV"}, {"Class", "C"}}, accountInfo("1")});
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"(null)", "1"}));
  EXPECT_EQ(store->originalAccountsByID().size(), 1U);
  EXPECT_EQ(device.logLines(),
            (Lines{"<ASSBasicAccount: (null)> returned a nil identifier. Account "
                   "properties may not get saved"}));
}

TEST_F(Loading, SnapshotIsACopyOfItsOwnAndReplacesTheFormer) {
  const auto store =
      OpenStore::ofAccounts({accountInfo("1", "CalDAV", {{"list", Array{1}}}), accountInfo("2")});
  const AccountPtr account = store->accountWithIdentifier("1");
  account->setAccountPropertyForKey(Array{1, 2}, "list");
  account->properties().set("n", 3);
  EXPECT_EQ(store->originalAccountsByID().at("1"),
            accountInfo("1", "CalDAV", {{"list", Array{1}}}));
  store->deleteAccountWithIdentifier("2");
  store->_setOriginalAccountDictionaries();
  EXPECT_EQ(store->originalAccountsByID().size(), 1U);
  EXPECT_EQ(store->originalAccountsByID().at("1"),
            accountInfo("1", "CalDAV", {{"list", Array{1, 2}}, {"n", 3}}));
}

TEST_F(Loading, AllAccountsAreALiveArray) {
  const auto store = OpenStore::ofAccounts({accountInfo("1"), accountInfo("2")});
  const auto accounts = store->allBasicAccounts();
  store->insertAccount(ASSBasicAccount::initWithProperties(accountInfo("3")));
  store->deleteAccountWithIdentifier("1");
  EXPECT_EQ(identifiersOf(*accounts), (Lines{"2", "3"}));
}

TEST_F(Loading, VersionOfTheDataCanBeSetAndStaysANumber) {
  const auto store = OpenStore::ofAccounts({});
  store->setDataVersion(-5);
  EXPECT_EQ(store->dataVersion(), -5);
}

}  // namespace
}  // namespace accountsettings
