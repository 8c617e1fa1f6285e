#include <gtest/gtest.h>

#include <utility>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

class Saving : public ::testing::Test {
 protected:
  // Changes the file as another process would: one account's properties, merged with nothing.
  void writeOnDisk(const Array& accounts) { device.writeAccounts(accounts); }
  static AccountPtr first(const AccountsManagerPtr& store) {
    return (*store->allBasicAccounts())[0];
  }
  AccountsDevice device;
};

TEST_F(Saving, WritesAccountsInOrderVersionTwelveAndNothingElse) {
  device.writeSettings({{"Version", 7},
                        {"Accounts", Array{accountInfo("b"), accountInfo("a")}},
                        {"Other Root Key", "lost"}});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  store->setDataVersion(99);
  store->insertAccount(ASSBasicAccount::initWithProperties(accountInfo("0")));
  store->saveAllAccounts();
  EXPECT_EQ(
      device.readSettings(),
      (Dictionary{{"Version", 12},
                  {"Accounts", Array{accountInfo("b"), accountInfo("a"), accountInfo("0")}}}));
  EXPECT_EQ(store->dataVersion(), 99);
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(Saving, WritesTheBinaryFormAlsoOverAnXMLFile) {
  device.writeSettingsBytes(*propertylist::writeXMLPropertyList(
      Dictionary{{"Version", 12}, {"Accounts", Array{accountInfo("1")}}}));
  ASSAccountsManager::init()->saveAllAccounts();
  EXPECT_TRUE(device.readSettingsBytes()->starts_with("bplist00"));
  EXPECT_EQ(device.savedAccounts(), Array{accountInfo("1")});
}

TEST_F(Saving, EmptyStoreWritesAnEmptyList) {
  ASSAccountsManager::init()->saveAllAccounts();
  EXPECT_EQ(device.readSettings(), (Dictionary{{"Version", 12}, {"Accounts", Array()}}));
}

TEST_F(Saving, UnchangedStoreWritesTheSameBytesAgain) {
  device.writeAccounts({accountInfo("1", "CalDAV", {{"n", 1.5}}), accountInfo("2")});
  ASSAccountsManager::init()->saveAllAccounts();
  const std::optional<std::string> bytes = device.readSettingsBytes();
  ASSAccountsManager::init()->saveAllAccounts();
  EXPECT_EQ(device.readSettingsBytes(), bytes);
}

TEST_F(Saving, KeysThatNothingInterpretsPassThrough) {
  const Dictionary info =
      accountInfo("1", "CalDAV",
                  {{"Username", "ada"},
                   {"Prevent Recents Syncing", true},
                   {"Subscribed Calendars", Array{Dictionary{{"URL", "webcal://x"}}}},
                   {"Never Heard Of", Dictionary{{"date", propertylist::Date{12.5}},
                                                 {"data", propertylist::Bytes{0, 255}},
                                                 {"big", std::uint64_t{18446744073709551615U}},
                                                 {"real", -0.0}}}});
  device.writeAccounts({info});
  ASSAccountsManager::init()->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{info});
}

TEST_F(Saving, TwoStoresThatChangeDifferentKeysLeaveBothChanges) {
  device.writeAccounts({accountInfo("1", "CalDAV", {{"a", 1}, {"b", 1}})});
  const AccountsManagerPtr one = ASSAccountsManager::init();
  const AccountsManagerPtr other = ASSAccountsManager::init();
  first(one)->setAccountPropertyForKey(2, "a");
  first(other)->setAccountPropertyForKey(2, "b");
  one->saveAllAccounts();
  other->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{accountInfo("1", "CalDAV", {{"a", 2}, {"b", 2}})});
}

TEST_F(Saving, ValueSetBackToWhatWasLoadedCountsAsUnchanged) {
  device.writeAccounts({accountInfo("1", "CalDAV", {{"a", 1}, {"b", 1}})});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  for (const char* key : {"a", "b"}) {
    first(store)->setAccountPropertyForKey(5, key);
    first(store)->setAccountPropertyForKey(1, key);
  }
  writeOnDisk({accountInfo("1", "CalDAV", {{"a", 9}})});
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{accountInfo("1", "CalDAV", {{"a", 9}})});
}

TEST_F(Saving, NewUIDOfALoadedAccountIsWrittenAsAChangeInMemory) {
  device.writeAccounts({Dictionary{{"Type", "CalDAV"}, {"Class", "C"}}});
  ASSAccountsManager::init()->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(),
            (Array{Dictionary{{"Type", "CalDAV"},
                              {"Class", "C"},
                              {"Identifier", "00000000-0000-4000-8000-000000000001"},
                              {"Sync Identifier", "00000000-0000-4000-8000-000000000001"}}}));
}

TEST_F(Saving, MemoryDoesNotTakeOverWhatOnlyTheFileHasAndTheNextSaveKeepsIt) {
  device.writeAccounts({accountInfo("1", "CalDAV", {{"a", 1}})});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  const Dictionary onDisk = accountInfo("1", "CalDAV", {{"a", 5}, {"d", 6}});
  writeOnDisk({onDisk});
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{onDisk});
  EXPECT_EQ(first(store)->properties(), accountInfo("1", "CalDAV", {{"a", 1}}));
  EXPECT_EQ(first(store)->originalProperties(), accountInfo("1", "CalDAV", {{"a", 1}}));
  first(store)->setAccountPropertyForKey(2, "n");
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{with(onDisk, "n", 2)});
}

TEST_F(Saving, RenewsTheBaseOfTheNextMergeFromMemory) {
  device.writeAccounts({accountInfo("1", "CalDAV", {{"a", 1}})});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  first(store)->setAccountPropertyForKey(2, "a");
  store->saveAllAccounts();
  EXPECT_EQ(first(store)->originalProperties(), accountInfo("1", "CalDAV", {{"a", 2}}));
  writeOnDisk({accountInfo("1", "CalDAV", {{"a", 3}})});
  store->saveAllAccounts();  // not changed in memory since the last save: the disk wins
  EXPECT_EQ(device.savedAccounts(), Array{accountInfo("1", "CalDAV", {{"a", 3}})});
}

TEST_F(Saving, BaseIsTheRecordsOwnNotTheStoresSnapshot) {
  device.writeAccounts({accountInfo("1", "CalDAV", {{"a", 1}})});
  const auto store = OpenStore::ofFile();
  const AccountPtr account = first(store);
  account->setAccountPropertyForKey(2, "a");
  account->setOriginalProperties(account->properties());  // as if saved by another store
  writeOnDisk({accountInfo("1", "CalDAV", {{"a", 5}})});
  store->saveAllAccounts();
  EXPECT_EQ(store->originalAccountsByID().at("1"), accountInfo("1", "CalDAV", {{"a", 1}}));
  EXPECT_EQ(device.savedAccounts(), Array{accountInfo("1", "CalDAV", {{"a", 5}})});
}

TEST_F(Saving, RecordPutIntoAnotherStoreIsMergedAgainstItsOwnBase) {
  device.writeAccounts({accountInfo("1", "CalDAV", {{"a", 1}, {"b", 1}})});
  const AccountPtr account = first(ASSAccountsManager::init());
  account->setAccountPropertyForKey(2, "a");
  writeOnDisk({accountInfo("1", "CalDAV", {{"a", 1}, {"b", 7}})});
  const AccountsManagerPtr other = ASSAccountsManager::init();
  other->replaceAccountsWithTypesWithAccounts({"CalDAV"}, {account});
  other->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{accountInfo("1", "CalDAV", {{"a", 2}, {"b", 7}})});
}

TEST_F(Saving, SnapshotStaysAsLoadedWhileNotificationsAreSkipped) {
  device.writeAccounts({accountInfo("1"), accountInfo("2")});
  const auto store = OpenStore::ofFile();
  first(store)->setAccountPropertyForKey(2, "a");
  store->deleteAccountWithIdentifier("2");
  store->saveAllAccounts();
  EXPECT_EQ(store->originalAccountsByID().size(), 2U);
  EXPECT_EQ(store->originalAccountsByID().at("1"), accountInfo("1"));
}

TEST_F(Saving, RenewsTheSnapshotWhenTheNotifiersHaveBeenTold) {
  ASSAccountsManager::_setShouldSkipNotifications(false);
  device.writeAccounts({accountInfo("1"), accountInfo("2")});
  const auto store = OpenStore::ofFile();
  first(store)->setAccountPropertyForKey(2, "a");
  store->deleteAccountWithIdentifier("2");
  store->saveAllAccounts();
  EXPECT_EQ(store->originalAccountsByID().size(), 1U);
  EXPECT_EQ(store->originalAccountsByID().at("1"), accountInfo("1", "CalDAV", {{"a", 2}}));
}

TEST_F(Saving, TellsTheNotifiersOfWhatWasSavedAlone) {
  ASSAccountsManager::_setShouldSkipNotifications(false);
  device.setResource("AccountCreators", Dictionary());  // whoever looks for notifiers finds none
  device.writeAccounts({accountInfo("1")});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  first(store)->setAccountPropertyForKey(Array{kAccountDataclassCalendars}, "Enabled Dataclasses");
  const auto users = std::exchange(device.userDatabase.users, {});
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{accountInfo("1")});
  device.userDatabase.users = users;
  expectAssertionFailure(
      "Malformed AccountCreators information. Could not find the information for the type CalDAV",
      "ASSAccountsManager", [&] { store->saveAllAccounts(); });
}

TEST_F(Saving, ExactlyTheAccountsInMemoryAreWritten) {
  device.writeAccounts({accountInfo("1"), accountInfo("2"), accountInfo("3")});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  store->deleteAccountWithIdentifier("1");
  writeOnDisk(
      {accountInfo("1", "CalDAV", {{"changed", true}}), accountInfo("2"), accountInfo("added")});
  store->saveAllAccounts();
  // "1" is gone though the disk changed it, "3" comes back, "added" is lost.
  EXPECT_EQ(device.savedAccounts(), (Array{accountInfo("2"), accountInfo("3")}));
}

TEST_F(Saving, AccountThatIsAChildOnDiskIsMergedWithTheParentThere) {
  device.writeAccounts({accountInfo("x", "CalDAV", {{"a", 1}})});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  writeOnDisk({accountInfo(
      "p", "CardDAV", {{"from the parent", true}, {"ChildAccounts", Array{accountInfo("x")}}})});
  store->saveAllAccounts();
  // What did not change in memory follows the dictionary found, which is the parent's.
  EXPECT_EQ(
      device.savedAccounts(),
      Array{accountInfo("p", "CardDAV",
                        {{"from the parent", true}, {"ChildAccounts", Array{accountInfo("x")}}})});
}

TEST_F(Saving, ChildrenAreMergedAsOneValueOfTheirParent) {
  const auto parent = [](const Array& children) {
    return accountInfo("p", "CalDAV", {{"ChildAccounts", children}});
  };
  device.writeAccounts({parent({accountInfo("1")})});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  writeOnDisk({parent({accountInfo("1"), accountInfo("on disk")})});
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{parent({accountInfo("1"), accountInfo("on disk")})});
  store->addChildToAccount(ASSBasicAccount::initWithProperties(accountInfo("in memory")),
                           first(store));
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{parent({accountInfo("1"), accountInfo("in memory")})});
}

TEST_F(Saving, AccountIsWrittenAsOftenAsItIsListed) {
  device.writeAccounts(
      {accountInfo("1", "CalDAV", {{"n", 1}}), accountInfo("1", "CalDAV", {{"n", 2}})});
  ASSAccountsManager::init()->saveAllAccounts();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"1", "1"}));
}

TEST_F(Saving, MissingFileMakesEveryAccountGoAsItIsInMemory) {
  const AccountsManagerPtr store =
      ASSAccountsManager::initWithAccounsInfoArray(Array{accountInfo("1", "CalDAV", {{"a", 1}})});
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{accountInfo("1", "CalDAV", {{"a", 1}})});
}

TEST_F(Saving, IsTracedStepByStep) {
  device.writeAccounts({accountInfo("1", "CalDAV", {{"Enabled Dataclasses", Array{"x"}}})});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  device.traceVerbosely();
  store->insertAccount(ASSBasicAccount::initWithProperties(accountInfo("2", "SMTP")));
  store->saveAllAccounts();
  const std::string one = "{Class = C; Enabled Dataclasses = (x); Identifier = 1; Type = CalDAV}";
  const std::string two = "{Class = C; Identifier = 2; Type = SMTP}";
  EXPECT_EQ(device.logLines(),
            (Lines{"Inserting account:", "Saving all accounts",
                   "Merging inmem " + one + " orig " + one + " onDisk " + one, "merged to " + one,
                   "CalDAV:" + one, "Merging inmem " + two + " orig " + two + " onDisk (null)",
                   "merged to " + two, "SMTP:" + two}));
}

TEST_F(Saving, AsksForRestrictionsOncePerAccountWithAListAlsoWhileTracingIsOff) {
  device.writeAccounts({accountInfo("1", "CalDAV", {{"Enabled Dataclasses", Array{"x"}}}),
                        accountInfo("2"),
                        accountInfo("3", "CalDAV", {{"Enabled Dataclasses", Array()}})});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  EXPECT_EQ(device.restrictions.calls().size(), 0U);
  store->saveAllAccounts();
  EXPECT_EQ(device.restrictions.calls().size(), 10U);
  store->saveAllAccounts();
  EXPECT_EQ(device.restrictions.calls().size(), 20U);
}

// A parent's list is looked at first, and the account's own when that is empty.
TEST_F(Saving, AsksForRestrictionsOfAListedChildAndOfItsParent) {
  device.writeAccounts({});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  const AccountPtr child = ASSBasicAccount::initWithProperties(
      accountInfo("2", "CalDAV", {{"Enabled Dataclasses", Array{"x"}}}));
  child->setParentAccount(ASSBasicAccount::initWithProperties(
      accountInfo("1", "CalDAV", {{"Enabled Dataclasses", Array()}})));
  store->insertAccount(child);
  EXPECT_EQ(device.restrictions.calls().size(), 0U);
  store->saveAllAccounts();
  EXPECT_EQ(device.restrictions.calls().size(), 10U);
}

TEST_F(Saving, TakesNoLock) {
  const auto held = device.fileLock.lockByName("AccountMigrationInProgress");
  const std::size_t before = device.fileLock.calls().size();
  ASSAccountsManager::init()->saveAllAccounts();
  EXPECT_EQ(device.fileLock.calls().size(), before);
  EXPECT_TRUE(device.readSettingsBytes().has_value());
}

}  // namespace
}  // namespace accountsettings
