#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

Dictionary parentInfo(std::string_view identifier, const Array& children,
                      std::string_view type = "CalDAV") {
  return accountInfo(identifier, type, {{"ChildAccounts", children}});
}

AccountPtr record(const Dictionary& info) { return ASSBasicAccount::initWithProperties(info); }

AccountPtr childRecord(const Dictionary& info, const AccountPtr& parent) {
  const AccountPtr child = record(info);
  child->setParentAccount(parent);
  return child;
}

// Deals with a store of "a" (CalDAV, child "a1"), "m" (SMTP, child "m1"), "b" (CalDAV).
class ReplaceAccountsWithTypes : public ::testing::Test {
 protected:
  ReplaceAccountsWithTypes()
      : store(OpenStore::ofAccounts({parentInfo("a", {accountInfo("a1")}),
                                     parentInfo("m", {accountInfo("m1")}, "SMTP"),
                                     accountInfo("b")})) {}
  void replace(const StringList& types, const AccountArray& accounts) {
    store->replaceAccountsWithTypesWithAccounts(types, accounts);
  }
  AccountPtr at(std::size_t index) const { return (*store->allBasicAccounts())[index]; }
  Lines order() const { return identifiersOf(*store->allBasicAccounts()); }
  static Array childrenOf(const AccountPtr& account) {
    const Array* children = propertylist::findArray(account->properties(), "ChildAccounts");
    return children != nullptr ? *children : Array{"no list"};
  }
  AccountsDevice device;
  std::shared_ptr<OpenStore> store;
};

TEST_F(ReplaceAccountsWithTypes, PutsAnAccountOfAKnownIdentifierInPlaceWhateverTheTypes) {
  const AccountPtr a = record(parentInfo("a", {accountInfo("a2")}, "Exchange"));
  const AccountPtr kept = at(1);
  replace({"Yahoo"}, {a});
  EXPECT_EQ(order(), (Lines{"a", "m", "b"}));
  EXPECT_EQ(at(0), a);
  EXPECT_EQ(at(1), kept);
  EXPECT_EQ(store->accountWithIdentifier("a"), a);
  EXPECT_EQ(store->children(), (Lines{"a2 of a", "m1 of m"}));
}

TEST_F(ReplaceAccountsWithTypes, RemovesTheOtherAccountsOfTheTypesWithTheirChildren) {
  replace({"CalDAV"}, {});
  EXPECT_EQ(order(), (Lines{"m"}));
  EXPECT_EQ(store->children(), (Lines{"m1 of m"}));
  EXPECT_EQ(store->accountWithIdentifier("a"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier("b"), nullptr);
  EXPECT_NE(store->accountWithIdentifier("m"), nullptr);
}

TEST_F(ReplaceAccountsWithTypes, AppendsNewAccountsInTheirOrder) {
  const AccountPtr x = record(parentInfo("x", {accountInfo("x1")}, "SMTP"));
  const AccountPtr b = record(accountInfo("b"));
  const AccountPtr y = record(accountInfo("y"));
  replace({"CalDAV"}, {x, b, y});
  EXPECT_EQ(order(), (Lines{"m", "b", "x", "y"}));
  EXPECT_EQ(store->accountWithIdentifier("x"), x);
  EXPECT_EQ(store->accountWithIdentifier("y"), y);
  EXPECT_EQ(store->children(), (Lines{"m1 of m", "x1 of x"}));
}

TEST_F(ReplaceAccountsWithTypes, ReplacesADeviceLocalAccountInPlaceOrAppendsIt) {
  const auto local =
      ASSDeviceLocalAccount::initWithProperties(ASSDeviceLocalAccount::basicAccountProperties());
  replace({"OnMyDevice"}, {local});
  EXPECT_EQ(order(), (Lines{"a", "m", "b", "DeviceLocalAccount"}));
  store->deleteAccountWithIdentifier("b");
  store->insertAccount(record(accountInfo("z")));
  const auto second =
      ASSDeviceLocalAccount::initWithProperties(ASSDeviceLocalAccount::basicAccountProperties());
  replace({"OnMyDevice"}, {second});
  EXPECT_EQ(order(), (Lines{"a", "m", "DeviceLocalAccount", "z"}));
  EXPECT_EQ(at(2), second);
}

TEST_F(ReplaceAccountsWithTypes, GoesByTheIdentifierProperty) {
  const auto local = OpenStore::ofAccounts({accountInfo("X", "OnMyDevice"), accountInfo("1")});
  const AccountPtr stored = (*local->allBasicAccounts())[0];
  const AccountPtr replacement =
      ASSDeviceLocalAccount::initWithProperties(accountInfo("X", "OnMyDevice", {{"n", 1}}));
  local->replaceAccountsWithTypesWithAccounts({}, {replacement});
  EXPECT_EQ((*local->allBasicAccounts())[0], replacement);
  EXPECT_EQ(local->accountWithIdentifier("X"), replacement);
  EXPECT_EQ(local->accountWithIdentifier("DeviceLocalAccount"), nullptr);
}

TEST_F(ReplaceAccountsWithTypes, OfTwoGivenAccountsOfOneIdentifierTheLaterReplaces) {
  const AccountPtr earlier = record(accountInfo("a", "CalDAV", {{"n", 1}}));
  const AccountPtr later = record(accountInfo("a", "CalDAV", {{"n", 2}}));
  replace({}, {earlier, later});
  EXPECT_EQ(order(), (Lines{"a", "m", "b", "a"}));
  EXPECT_EQ(at(0), later);
  EXPECT_EQ(at(3), earlier);
  EXPECT_EQ(store->accountWithIdentifier("a"), earlier);
}

TEST_F(ReplaceAccountsWithTypes, InstallsAnotherArray) {
  const auto before = store->allBasicAccounts();
  replace({"CalDAV"}, {});
  EXPECT_EQ(identifiersOf(*before), (Lines{"a", "m", "b"}));
  EXPECT_NE(store->allBasicAccounts(), before);
}

TEST_F(ReplaceAccountsWithTypes, TakesTheStoresOwnArray) {
  replace({"CalDAV", "SMTP"}, *store->allBasicAccounts());
  EXPECT_EQ(order(), (Lines{"a", "m", "b"}));
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "m1 of m"}));
}

TEST_F(ReplaceAccountsWithTypes, OfTwoKeptAccountsOfOneIdentifierTheEarlierIsFound) {
  const auto twice = OpenStore::ofAccounts(
      {accountInfo("x", "CalDAV", {{"n", 1}}), accountInfo("x", "CalDAV", {{"n", 2}})});
  EXPECT_EQ(twice->accountWithIdentifier("x"), (*twice->allBasicAccounts())[1]);
  twice->replaceAccountsWithTypesWithAccounts({"SMTP"}, {});
  EXPECT_EQ(identifiersOf(*twice->allBasicAccounts()), (Lines{"x", "x"}));
  EXPECT_EQ(twice->accountWithIdentifier("x"), (*twice->allBasicAccounts())[0]);
}

TEST_F(ReplaceAccountsWithTypes, ChildIsReplacedInItsParentRatherThanDoubled) {
  const AccountPtr a = at(0);
  replace({}, {childRecord(accountInfo("a1", "CalDAV", {{"n", 2}}), a)});
  EXPECT_EQ(order(), (Lines{"a", "m", "b"}));
  EXPECT_EQ(childrenOf(a), (Array{accountInfo("a1", "CalDAV", {{"n", 2}})}));
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "m1 of m"}));
}

TEST_F(ReplaceAccountsWithTypes, ChildThatStaysIsReplacedInTheReplacementOfItsParent) {
  const AccountPtr oldParent = at(0);
  const AccountPtr newParent = record(parentInfo("a", {accountInfo("a1"), accountInfo("a2")}));
  replace({}, {newParent, childRecord(accountInfo("a1", "CalDAV", {{"n", 2}}), newParent)});
  EXPECT_EQ(childrenOf(newParent),
            (Array{accountInfo("a2"), accountInfo("a1", "CalDAV", {{"n", 2}})}));
  EXPECT_EQ(childrenOf(oldParent), (Array{accountInfo("a1")}));
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "a2 of a", "m1 of m"}));
}

TEST_F(ReplaceAccountsWithTypes, NewChildIsAddedToItsParent) {
  replace({}, {childRecord(accountInfo("b1"), at(2))});
  EXPECT_EQ(order(), (Lines{"a", "m", "b"}));
  EXPECT_EQ(childrenOf(at(2)), (Array{accountInfo("b1")}));
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "b1 of b", "m1 of m"}));
}

TEST_F(ReplaceAccountsWithTypes, ChildThatMovesIsTakenOutOfItsOldParent) {
  replace({}, {childRecord(accountInfo("a1"), at(2))});
  EXPECT_EQ(childrenOf(at(0)), Array());
  EXPECT_EQ(childrenOf(at(2)), (Array{accountInfo("a1")}));
  EXPECT_EQ(store->children(), (Lines{"a1 of b", "m1 of m"}));
  EXPECT_EQ(store->childAccountsByID().at("a1")->parentAccount(), at(2));
}

TEST_F(ReplaceAccountsWithTypes, MovingChildLeavesTheOldParentObjectNotItsReplacement) {
  const AccountPtr oldParent = at(0);
  const AccountPtr newParent = record(parentInfo("a", {accountInfo("a1")}));
  replace({}, {newParent, childRecord(accountInfo("a1"), at(2))});
  EXPECT_EQ(childrenOf(oldParent), Array());
  EXPECT_EQ(childrenOf(newParent), (Array{accountInfo("a1")}));
  EXPECT_EQ(childrenOf(at(2)), (Array{accountInfo("a1")}));
}

TEST_F(ReplaceAccountsWithTypes, ChildWhoseOldParentIsUnknownIsJustAdded) {
  store->replaceAccountWithAccount(at(0), record(at(0)->properties()));  // no longer registered
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "m1 of m"}));
  replace({}, {childRecord(accountInfo("a1"), at(2))});
  EXPECT_EQ(childrenOf(at(0)), (Array{accountInfo("a1")}));
  EXPECT_EQ(childrenOf(at(2)), (Array{accountInfo("a1")}));
}

TEST_F(ReplaceAccountsWithTypes, ParentAndChildMayBothBeNewWhenTheParentComesFirst) {
  const AccountPtr parent = record(accountInfo("new"));
  replace({}, {parent, childRecord(accountInfo("n1"), parent)});
  EXPECT_EQ(order(), (Lines{"a", "m", "b", "new"}));
  EXPECT_EQ(childrenOf(parent), (Array{accountInfo("n1")}));
  EXPECT_EQ(store->children(), (Lines{"a1 of a", "m1 of m", "n1 of new"}));
}

TEST_F(ReplaceAccountsWithTypes, ChildWithoutItsParentInPlaceChangesNothing) {
  const AccountPtr newParent = record(accountInfo("new"));
  const AccountPtr unplaced = record(accountInfo("elsewhere"));
  const struct {
    const char* name;
    StringList types;
    AccountArray accounts;
  } kCases[] = {
      {"parent nowhere", {"SMTP"}, {childRecord(accountInfo("c"), unplaced)}},
      {"parent removed by the call", {"CalDAV"}, {childRecord(accountInfo("c"), at(0))}},
      {"parent comes later", {}, {childRecord(accountInfo("c"), newParent), newParent}},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    replace(c.types, c.accounts);
    EXPECT_EQ(order(), (Lines{"a", "m", "b"}));
    EXPECT_EQ(store->children(), (Lines{"a1 of a", "m1 of m"}));
    EXPECT_NE(store->accountWithIdentifier("m"), nullptr);
  }
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(ReplaceAccountsWithTypes, IsTracedFirst) {
  device.traceVerbosely();
  replace({"CalDAV"}, {childRecord(accountInfo("bad", "SMTP"), at(1))});
  EXPECT_EQ(device.logLines(), (Lines{"Replacing accounts"}));
}

TEST(ReplacedAccounts, StayInTheOrderInWhichTheyAreListed) {
  AccountsDevice device;
  const auto store = OpenStore::ofAccounts(
      {accountInfo("a", "CalDAV", {{"Sync Identifier", "same"}}),
       accountInfo("b", "CalDAV", {{"Sync Identifier", "same"}}), accountInfo("c", "CardDAV")});
  ASSERT_EQ(store->syncableAccountWithSyncIdentifier("same")->identifier(), "a");
  store->replaceAccountsWithTypesWithAccounts({"CardDAV"}, {});
  EXPECT_EQ(store->syncableAccountWithSyncIdentifier("same")->identifier(), "a");
}

}  // namespace
}  // namespace accountsettings
