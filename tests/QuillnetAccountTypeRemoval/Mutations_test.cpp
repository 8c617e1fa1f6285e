#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

Dictionary parentInfo(std::string_view identifier, const Array& children,
                      std::string_view type = "CalDAV") {
  return accountInfo(identifier, type, {{"ChildAccounts", children}});
}

AccountPtr record(const Dictionary& info) { return ASSBasicAccount::initWithProperties(info); }

// Deals with a store of "a" (children "a1", "a2"), "b" and "c" (child "c1").
class Mutations : public ::testing::Test {
 protected:
  Mutations()
      : store(OpenStore::ofAccounts({parentInfo("a", {accountInfo("a1"), accountInfo("a2")}),
                                     accountInfo("b"), parentInfo("c", {accountInfo("c1")})})) {}
  AccountPtr at(std::size_t index) const { return (*store->allBasicAccounts())[index]; }
  Lines order() const { return identifiersOf(*store->allBasicAccounts()); }
  AccountsDevice device;
  std::shared_ptr<OpenStore> store;
};

TEST_F(Mutations, UpdateTakesThePlaceOfTheStoredAccount) {
  const AccountPtr updated = record(parentInfo("a", {accountInfo("a3")}));
  store->updateAccount(updated);
  EXPECT_EQ(at(0), updated);
  EXPECT_EQ(order(), (Lines{"a", "b", "c"}));
  EXPECT_EQ(store->accountWithIdentifier("a"), updated);
  EXPECT_EQ(store->children(), (Lines{"a3 of a", "c1 of c"}));
  EXPECT_EQ(store->childAccountsByID().at("a3")->parentAccount(), updated);
}

TEST_F(Mutations, UpdateReplacesEveryAccountOfTheIdentifier) {
  const auto twice = OpenStore::ofAccounts({accountInfo("x"), accountInfo("y"), accountInfo("x")});
  const AccountPtr updated = record(accountInfo("x"));
  twice->updateAccount(updated);
  EXPECT_EQ((*twice->allBasicAccounts())[0], updated);
  EXPECT_EQ((*twice->allBasicAccounts())[2], updated);
  EXPECT_EQ(identifiersOf(*twice->allBasicAccounts()), (Lines{"x", "y", "x"}));
}

TEST_F(Mutations, UpdateNeverInserts) {
  store->updateAccount(record(parentInfo("new", {accountInfo("n1")})));
  EXPECT_EQ(order(), (Lines{"a", "b", "c"}));
  EXPECT_EQ(store->accountWithIdentifier("new"), nullptr);
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "a2 of a", "c1 of c"}));
}

TEST_F(Mutations, UpdateOfAnAccountWithoutIdentifierChangesNothing) {
  const AccountPtr nameless = record(accountInfo("x"));
  nameless->removeAccountPropertyForKey("Identifier");
  store->updateAccount(nameless);
  EXPECT_EQ(order(), (Lines{"a", "b", "c"}));
}

TEST_F(Mutations, InsertAppendsAndRegistersWithChildren) {
  const AccountPtr inserted = record(parentInfo("d", {accountInfo("d1")}));
  store->insertAccount(inserted);
  EXPECT_EQ(order(), (Lines{"a", "b", "c", "d"}));
  EXPECT_EQ(store->accountWithIdentifier("d"), inserted);
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "a2 of a", "c1 of c", "d1 of d"}));
}

TEST_F(Mutations, DeletedAccountCanBeInsertedAgain) {
  const AccountPtr deleted = store->accountWithIdentifier("a");
  store->deleteAccount(deleted);
  EXPECT_EQ(store->accountWithIdentifier("a"), nullptr);
  store->insertAccount(deleted);
  EXPECT_EQ(order(), (Lines{"b", "c", "a"}));
  EXPECT_EQ(store->accountWithIdentifier("a"), deleted);
}

TEST_F(Mutations, InsertOfAKnownIdentifierChangesNothing) {
  const AccountPtr stored = at(0);
  store->insertAccount(record(parentInfo("a", {accountInfo("a9")})));
  EXPECT_EQ(order(), (Lines{"a", "b", "c"}));
  EXPECT_EQ(at(0), stored);
  EXPECT_EQ(store->accountWithIdentifier("a"), stored);
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "a2 of a", "c1 of c"}));
}

TEST_F(Mutations, IdentifierOfAChildDoesNotBlockAnInsertion) {
  store->insertAccount(record(accountInfo("a1")));
  EXPECT_EQ(order(), (Lines{"a", "b", "c", "a1"}));
}

TEST_F(Mutations, AccountPlacedByReplaceCanBeInsertedASecondTime) {
  store->replaceAccountWithAccount(at(1), record(accountInfo("new")));
  for (int i = 0; i < 8; ++i)  // from the store's own array, which grows meanwhile
    store->insertAccount((*store->allBasicAccounts())[1]);
  EXPECT_EQ(order(), (Lines{"a", "new", "c", "new"}));
  EXPECT_EQ(at(1), at(3));
  EXPECT_EQ(store->accountWithIdentifier("new"), at(1));
}

TEST_F(Mutations, DeleteRemovesAccountAndChildrenFromEveryIndex) {
  store->deleteAccount(at(0));
  EXPECT_EQ(order(), (Lines{"b", "c"}));
  EXPECT_EQ(store->accountWithIdentifier("a"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier("a1"), nullptr);
  EXPECT_EQ(store->children(), (Lines{"c1 of c"}));
  EXPECT_EQ(identifiersOf(store->allBasicSyncableAccounts()), (Lines{"b", "c", "c1"}));
}

TEST_F(Mutations, DeletedAccountsChildrenAreNotFoundByTheirSyncIdentifier) {
  store->childAccountsByID().at("c1")->setAccountPropertyForKey("sync", "Sync Identifier");
  EXPECT_NE(store->syncableAccountWithSyncIdentifier("sync"), nullptr);
  store->deleteAccountWithIdentifier("c");
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("sync"), nullptr);
}

TEST_F(Mutations, DeleteMatchesByIdentifierNotByObject) {
  store->deleteAccount(record(accountInfo("b")));
  EXPECT_EQ(order(), (Lines{"a", "c"}));
}

TEST_F(Mutations, DeleteTakesTheLastOfTwoAccountsOfOneIdentifier) {
  const auto twice =
      OpenStore::ofAccounts({accountInfo("x", "CalDAV", {{"n", 1}}), accountInfo("y"),
                             accountInfo("x", "CalDAV", {{"n", 2}})});
  const AccountPtr first = (*twice->allBasicAccounts())[0];
  twice->deleteAccount(first);
  EXPECT_EQ(identifiersOf(*twice->allBasicAccounts()), (Lines{"x", "y"}));
  EXPECT_EQ((*twice->allBasicAccounts())[0], first);
  EXPECT_EQ(twice->accountWithIdentifier("x"), nullptr);
}

TEST_F(Mutations, DeleteTakesEveryPlaceOfTheObjectItFound) {
  const auto twice = OpenStore::ofAccounts({accountInfo("x"), accountInfo("y"), accountInfo("x")});
  twice->updateAccount(record(accountInfo("x")));  // one object at both places
  twice->deleteAccountWithIdentifier("x");
  EXPECT_EQ(identifiersOf(*twice->allBasicAccounts()), (Lines{"y"}));
}

TEST_F(Mutations, DeleteTakesEveryPlaceOfAnObjectThatWasInsertedTwice) {
  const AccountPtr object = record(accountInfo("x"));
  store->insertAccount(object);
  object->setAccountPropertyForKey("y", "Identifier");
  store->insertAccount(object);
  EXPECT_EQ(order(), (Lines{"a", "b", "c", "y", "y"}));
  store->deleteAccount(object);
  EXPECT_EQ(order(), (Lines{"a", "b", "c"}));
}

TEST_F(Mutations, DeleteTakesEveryPlaceOfAnObjectThatReplacedTwoOthers) {
  const AccountPtr object = record(accountInfo("x"));
  store->replaceAccountWithAccount(at(0), object);
  store->replaceAccountWithAccount(at(2), object);
  EXPECT_EQ(order(), (Lines{"x", "b", "x"}));
  store->deleteAccount(object);
  EXPECT_EQ(order(), Lines{"b"});
}

TEST_F(Mutations, DeleteTakesEveryPlaceOfAnObjectThatReplacedATypeTwice) {
  const AccountPtr object = record(accountInfo("x"));
  store->replaceAccountsWithTypesWithAccounts({"CalDAV"}, {object, object});
  EXPECT_EQ(order(), (Lines{"x", "x"}));
  store->deleteAccount(object);
  EXPECT_EQ(order(), Lines());
}

TEST_F(Mutations, DeleteOfAnUnknownAccountLeavesTheOrder) {
  store->deleteAccount(record(accountInfo("nobody")));
  EXPECT_EQ(order(), (Lines{"a", "b", "c"}));
}

TEST_F(Mutations, DeleteByIdentifierLooksAtTopLevelAccountsOnly) {
  store->deleteAccountWithIdentifier("b");
  EXPECT_EQ(order(), (Lines{"a", "c"}));
  store->deleteAccountWithIdentifier("a1");
  store->deleteAccountWithIdentifier("nobody");
  EXPECT_EQ(order(), (Lines{"a", "c"}));
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "a2 of a", "c1 of c"}));
}

TEST_F(Mutations, ReplacePutsTheNewAccountAtTheOldOnesPlace) {
  const AccountPtr replacement = record(parentInfo("n", {accountInfo("n1")}));
  store->replaceAccountWithAccount(at(0), replacement);
  EXPECT_EQ(order(), (Lines{"n", "b", "c"}));
  EXPECT_EQ(at(0), replacement);
  EXPECT_EQ(store->children(), (Lines{"c1 of c", "n1 of n"}));
  EXPECT_EQ(store->accountWithIdentifier("a"), nullptr);
}

TEST_F(Mutations, ReplacedAccountIsListedButNotFoundByIdentifier) {
  store->replaceAccountWithAccount(at(0), record(parentInfo("n", {accountInfo("n1")})));
  EXPECT_EQ(store->accountWithIdentifier("n"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier("n1"), nullptr);
  store->saveAllAccounts();
  const AccountsManagerPtr loaded = ASSAccountsManager::init();
  EXPECT_EQ(loaded->accountWithIdentifier("n"), (*loaded->allBasicAccounts())[0]);
}

TEST_F(Mutations, ReplacedAccountWithAChildsIdentifierAnswersTheParent) {
  store->replaceAccountWithAccount(at(1), record(accountInfo("a1")));
  EXPECT_EQ(store->accountWithIdentifier("a1"), at(0));
}

TEST_F(Mutations, ReplaceWithinOneIdentifierAlsoLeavesItUnregistered) {
  const AccountPtr replacement = record(accountInfo("b", "CalDAV", {{"n", 1}}));
  store->replaceAccountWithAccount(at(1), replacement);
  EXPECT_EQ(at(1), replacement);
  EXPECT_EQ(store->accountWithIdentifier("b"), nullptr);
}

TEST_F(Mutations, ReplaceFindsTheOldAccountByIdentity) {
  const auto twice = OpenStore::ofAccounts({accountInfo("x"), accountInfo("x")});
  const AccountPtr first = (*twice->allBasicAccounts())[0];
  const AccountPtr replacement = record(accountInfo("n"));
  twice->replaceAccountWithAccount((*twice->allBasicAccounts())[1], replacement);
  EXPECT_EQ((*twice->allBasicAccounts())[0], first);
  EXPECT_EQ((*twice->allBasicAccounts())[1], replacement);
}

TEST_F(Mutations, ReplaceOfAnObjectThatTheStoreDoesNotHoldChangesNothing) {
  store->replaceAccountWithAccount(record(at(0)->properties()), record(accountInfo("n")));
  EXPECT_EQ(order(), (Lines{"a", "b", "c"}));
  EXPECT_NE(store->accountWithIdentifier("a"), nullptr);
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "a2 of a", "c1 of c"}));
}

TEST_F(Mutations, ReplaceInstallsAnotherArray) {
  const auto before = store->allBasicAccounts();
  store->replaceAccountWithAccount(at(1), record(accountInfo("n")));
  EXPECT_EQ(identifiersOf(*before), (Lines{"a", "b", "c"}));
}

TEST_F(Mutations, TraceTheirNamesAndWriteNothingElse) {
  device.traceVerbosely();
  device.writeAccounts({accountInfo("on disk")});
  const std::optional<std::string> bytes = device.readSettingsBytes();
  const AccountPtr b = at(1);
  store->updateAccount(record(accountInfo("b")));
  store->updateAccount(record(accountInfo("nobody")));
  store->insertAccount(record(accountInfo("new")));
  store->insertAccount(record(accountInfo("b")));
  store->replaceAccountWithAccount(at(0), b);
  store->deleteAccountWithIdentifier("new");
  store->deleteAccountWithIdentifier("nobody");
  store->deleteAccount(record(accountInfo("nobody")));
  store->replaceAccountsWithTypesWithAccounts({}, {});
  store->addChildToAccount(record(accountInfo("x")), at(1));
  store->removeChildWithIdentifierFromAccount("x", at(1));
  EXPECT_EQ(device.logLines(),
            (Lines{"Updating account:{Class = C; Identifier = b; Type = CalDAV}",
                   "Updating account:{Class = C; Identifier = nobody; Type = CalDAV}",
                   "Inserting account:", "Inserting account:", "Deleting account:",
                   "Deleting account:", "Replacing accounts"}));
  EXPECT_EQ(device.readSettingsBytes(), bytes);
  EXPECT_TRUE(device.journal.empty());
}

}  // namespace
}  // namespace accountsettings
