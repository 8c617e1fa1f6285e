#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

class Queries : public ::testing::Test {
 protected:
  Queries()
      // "p" with the children "c1" (with a sync identifier of its own) and "c2", then "m" and "q".
      : store(OpenStore::ofAccounts(
            {accountInfo("p", "CalDAV",
                         {{"Sync Identifier", "sync p"},
                          {"ChildAccounts",
                           Array{accountInfo("c1", "CardDAV", {{"Sync Identifier", "sync c1"}}),
                                 accountInfo("c2", "Mail")}}}),
             accountInfo("m", "Mail", {{"Class", "IMAPAccount"}, {"Sync Identifier", "sync m"}}),
             accountInfo("q", "CalDAV", {{"Sync Identifier", "sync q"}})})) {}
  AccountPtr topLevel(std::size_t index) const { return (*store->allBasicAccounts())[index]; }
  AccountPtr child(const std::string& identifier) const {
    return store->childAccountsByID().at(identifier);
  }
  AccountsDevice device;
  std::shared_ptr<OpenStore> store;
};

TEST_F(Queries, IdentifierOfATopLevelAccountFindsIt) {
  EXPECT_EQ(store->accountWithIdentifier("p"), topLevel(0));
  EXPECT_EQ(store->accountWithIdentifier("q"), topLevel(2));
}

TEST_F(Queries, IdentifierOfAChildFindsItsParent) {
  EXPECT_EQ(store->accountWithIdentifier("c1"), topLevel(0));
}

TEST_F(Queries, UnknownIdentifierFindsNothing) {
  EXPECT_EQ(store->accountWithIdentifier("nobody"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier(""), nullptr);
}

TEST_F(Queries, ChildWhoseParentIsNoLongerRegisteredFindsNothing) {
  const AccountPtr parent = topLevel(0);
  store->replaceAccountWithAccount(parent,
                                   ASSBasicAccount::initWithProperties(parent->properties()));
  EXPECT_EQ(store->children(), (Lines{"c1 of p", "c2 of p"}));
  EXPECT_EQ(store->accountWithIdentifier("c1"), nullptr);
}

TEST_F(Queries, ChildIsLookedUpByTheIdentifierThatItHasNow) {
  child("c1")->setAccountPropertyForKey("renamed", "Identifier");
  EXPECT_EQ(store->accountWithIdentifier("c1"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier("renamed"), nullptr);
}

TEST_F(Queries, TopLevelAccountWinsOverAChildOfItsIdentifier) {
  const auto clash = OpenStore::ofAccounts(
      {accountInfo("p", "CalDAV", {{"ChildAccounts", Array{accountInfo("x")}}}), accountInfo("x")});
  EXPECT_EQ(clash->accountWithIdentifier("x"), (*clash->allBasicAccounts())[1]);
}

TEST_F(Queries, SyncIdentifierFindsTopLevelAccountsAndChildren) {
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("sync m"), topLevel(1));
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("sync c1"), child("c1"));
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("p"), nullptr);
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("nobody"), nullptr);
}

TEST_F(Queries, ParentIsFoundBeforeTheChildThatInheritsItsSyncIdentifier) {
  EXPECT_EQ(child("c2")->syncStoreIdentifier(), "sync p");
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("sync p"), topLevel(0));
}

TEST_F(Queries, TopLevelAccountWinsOverAChildOfItsSyncIdentifier) {
  child("c1")->setAccountPropertyForKey("sync q", "Sync Identifier");
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("sync q"), topLevel(2));
}

TEST_F(Queries, DeviceLocalAccountIsFoundByItsIdentifierAsSyncIdentifier) {
  const auto local = OpenStore::ofAccounts(
      {accountInfo("X", "OnMyDevice", {{"Sync Identifier", "Y"}}), accountInfo("1")});
  EXPECT_EQ(local->syncableAccountWithSyncIdentifier("DeviceLocalAccount"),
            (*local->allBasicAccounts())[0]);
  EXPECT_EQ(local->syncableAccountWithSyncIdentifier("Y"), nullptr);
}

TEST_F(Queries, DisplayedAccountIsTheOneFoundOrTheParentOfAChild) {
  EXPECT_EQ(store->displayAccountWithSyncIdentifier("sync m"), topLevel(1));
  EXPECT_EQ(store->displayAccountWithSyncIdentifier("sync c1"), topLevel(0));
  EXPECT_EQ(store->displayAccountWithSyncIdentifier("nobody"), nullptr);
}

TEST_F(Queries, AllSyncableAccountsAreTopLevelOnesInOrderThenChildrenInANewArray) {
  AccountArray accounts = store->allBasicSyncableAccounts();
  EXPECT_EQ(identifiersOf(accounts), (Lines{"p", "m", "q", "c1", "c2"}));
  accounts.clear();
  EXPECT_EQ(store->count(), 3U);
}

TEST_F(Queries, AccountsOfTypesAreTopLevelOnesInOrder) {
  EXPECT_EQ(identifiersOf(store->basicAccountsWithTypes({"CalDAV"})), (Lines{"p", "q"}));
  EXPECT_EQ(identifiersOf(store->basicAccountsWithTypes({"Mail", "CalDAV"})),
            (Lines{"p", "m", "q"}));
  EXPECT_EQ(identifiersOf(store->basicAccountsWithTypes({"CardDAV"})), Lines());
  EXPECT_EQ(identifiersOf(store->basicAccountsWithTypes({})), Lines());
  AccountArray accounts = store->basicAccountsWithTypes({"CalDAV"});
  accounts.clear();
  EXPECT_EQ(store->count(), 3U);
}

TEST_F(Queries, CountsAreOfTopLevelAccounts) {
  EXPECT_EQ(store->count(), 3U);
  EXPECT_EQ(store->countOfBasicAccountsWithTypes({"CalDAV"}), 2U);
  EXPECT_EQ(store->countOfBasicAccountsWithTypes({"CardDAV"}), 0U);
  EXPECT_EQ(store->countOfBasicAccountsWithTypes({}), 0U);
  static_assert(std::is_unsigned_v<decltype(store->count())>);
}

TEST_F(Queries, ChangeNothingAndLogNothing) {
  const auto before = store->allBasicAccounts();
  store->syncableAccountWithSyncIdentifier("nobody");
  store->displayAccountWithSyncIdentifier("sync c1");
  store->allBasicSyncableAccounts();
  EXPECT_EQ(store->allBasicAccounts(), before);
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(Queries, DeviceLocalAccountIsTheFirstOneOfItsClass) {
  const auto local = OpenStore::ofAccounts(
      {accountInfo("1"), accountInfo("X", "OnMyDevice"), accountInfo("Y", "OnMyDevice")});
  EXPECT_EQ(local->fullDeviceLocalAccount(), (*local->allBasicAccounts())[1]);
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(Queries, MissingDeviceLocalAccountIsCreatedLastOnceAndSaidSo) {
  const auto created = store->fullDeviceLocalAccount();
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()),
            (Lines{"p", "m", "q", "DeviceLocalAccount"}));
  EXPECT_EQ(topLevel(3), created);
  EXPECT_EQ(created->properties(), ASSDeviceLocalAccount::basicAccountProperties());
  EXPECT_EQ(store->fullDeviceLocalAccount(), created);
  EXPECT_EQ(device.logLines(), (Lines{"DeviceLocalAccount missing. Creating..."}));
}

TEST_F(Queries, EmptyStoreGetsADeviceLocalAccountToo) {
  const auto empty = OpenStore::ofAccounts({});
  EXPECT_NE(empty->fullDeviceLocalAccount(), nullptr);
  EXPECT_EQ(empty->count(), 1U);
}

TEST_F(Queries, PlainRecordOfTheTypeIsReplacedInPlaceOrRemoved) {
  const auto plain = OpenStore::ofAccounts({});
  plain->insertAccount(
      ASSBasicAccount::initWithProperties(accountInfo("DeviceLocalAccount", "OnMyDevice")));
  plain->insertAccount(ASSBasicAccount::initWithProperties(accountInfo("other", "OnMyDevice")));
  plain->insertAccount(ASSBasicAccount::initWithProperties(accountInfo("1")));
  const auto created = plain->fullDeviceLocalAccount();
  EXPECT_EQ(identifiersOf(*plain->allBasicAccounts()), (Lines{"DeviceLocalAccount", "1"}));
  EXPECT_EQ((*plain->allBasicAccounts())[0], created);
  EXPECT_EQ(device.logLines(), (Lines{"DeviceLocalAccount missing. Creating..."}));
}

TEST_F(Queries, AccountOfTheClassButAnotherTypeDoesNotCount) {
  const auto other = OpenStore::ofAccounts({});
  other->insertAccount(ASSDeviceLocalAccount::initWithProperties(accountInfo("1", "CalDAV")));
  const auto created = other->fullDeviceLocalAccount();
  EXPECT_EQ(other->count(), 2U);
  EXPECT_EQ((*other->allBasicAccounts())[1], created);
}

TEST_F(Queries, CreatedAccountReachesTheFileWithTheNextSave) {
  device.writeAccounts({accountInfo("1")});
  const AccountsManagerPtr writing = ASSAccountsManager::init();
  writing->fullDeviceLocalAccount();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"1"}));
  ASSAccountsManager::init()->fullDeviceLocalAccount();
  EXPECT_EQ(device.logLines().size(), 2U);
  writing->saveAllAccounts();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"1", "DeviceLocalAccount"}));
  ASSAccountsManager::init()->fullDeviceLocalAccount();
  EXPECT_EQ(device.logLines().size(), 2U);
}

TEST_F(Queries, CreationIsTracedAfterItsLogLine) {
  device.traceVerbosely();
  store->fullDeviceLocalAccount();
  EXPECT_EQ(device.logLines(),
            (Lines{"DeviceLocalAccount missing. Creating...", "Replacing accounts"}));
}

TEST(DeviceLocalQuery, IsAnAssertionFailureWhereTheCatalogueLacksTheType) {
  AccountsDevice device;
  device.setResource("AccountTypesProperties", Dictionary{{"Mail", Dictionary()}});
  const auto store = OpenStore::ofAccounts({});
  expectAssertionFailure("The account type (OnMyDevice) is not supported", "ASSAccountsManager",
                         [&] { store->fullDeviceLocalAccount(); });
  EXPECT_EQ(store->count(), 0U);
}

}  // namespace
}  // namespace accountsettings
