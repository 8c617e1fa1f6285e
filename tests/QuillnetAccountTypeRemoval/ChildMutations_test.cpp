#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

AccountPtr record(const Dictionary& info) { return ASSBasicAccount::initWithProperties(info); }

// Deals with one parent "p" with the given children.
class ChildMutations : public ::testing::Test {
 protected:
  void setUp(const Array& children) {
    store = OpenStore::ofAccounts({accountInfo("p", "CalDAV", {{"ChildAccounts", children}})});
    parent = (*store->allBasicAccounts())[0];
    device.systemLog.clear();
  }
  Value children() const {
    const Value* value = parent->properties().find("ChildAccounts");
    return value != nullptr ? *value : Value("absent");
  }
  // The child index is what a load of the parent's list would give.
  void expectIndexFollowsTheList() const {
    const auto loaded = OpenStore::ofAccounts({parent->properties()});
    EXPECT_EQ(store->children(), loaded->children());
    for (const auto& [identifier, child] : store->childAccountsByID()) {
      EXPECT_EQ(child->parentAccount(), parent);
      EXPECT_EQ(child->properties(), loaded->childAccountsByID().at(identifier)->properties());
    }
  }
  AccountsDevice device;
  std::shared_ptr<OpenStore> store;
  AccountPtr parent;
};

TEST_F(ChildMutations, RemovalTakesTheChildOfTheIdentifier) {
  setUp({accountInfo("1"), accountInfo("2"), accountInfo("3")});
  store->removeChildWithIdentifierFromAccount("2", parent);
  EXPECT_EQ(children(), Value(Array{accountInfo("1"), accountInfo("3")}));
  EXPECT_EQ(store->children(), (Lines{"1 of p", "3 of p"}));
  expectIndexFollowsTheList();
}

TEST_F(ChildMutations, RemovalTakesEveryChildOfTheIdentifier) {
  setUp({accountInfo("1"), accountInfo("2"), accountInfo("1"),
         accountInfo("1", "CalDAV", {{"n", 1}})});
  store->removeChildWithIdentifierFromAccount("1", parent);
  EXPECT_EQ(children(), Value(Array{accountInfo("2")}));
  expectIndexFollowsTheList();
}

TEST_F(ChildMutations, RemovalOfAnUnknownIdentifierLeavesTheListAndLoadsItAgain) {
  setUp({accountInfo("1")});
  const AccountPtr before = store->childAccountsByID().at("1");
  store->removeChildWithIdentifierFromAccount("nobody", parent);
  EXPECT_EQ(children(), Value(Array{accountInfo("1")}));
  EXPECT_NE(store->childAccountsByID().at("1"), before);
  expectIndexFollowsTheList();
}

TEST_F(ChildMutations, RemovalOfTheLastChildLeavesAnEmptyList) {
  setUp({accountInfo("1")});
  store->removeChildWithIdentifierFromAccount("1", parent);
  EXPECT_EQ(children(), Value(Array()));
  EXPECT_EQ(store->children(), Lines());
}

TEST_F(ChildMutations, RemovalWhereThereIsNoListMakesNone) {
  setUp({});
  parent->removeAccountPropertyForKey("ChildAccounts");
  store->removeChildWithIdentifierFromAccount("1", parent);
  EXPECT_EQ(children(), Value("absent"));
}

TEST_F(ChildMutations, RemovalKeepsAndNamesInvalidChildren) {
  const Dictionary invalid{{"Identifier", "1"}, {"Type", "Fax"}, {"Class", "C"}};
  setUp({invalid, accountInfo("1"), "text"});
  store->removeChildWithIdentifierFromAccount("1", parent);
  EXPECT_EQ(children(), Value(Array{invalid, "text"}));
  const std::string line = "[-[ASSBasicAccount initWithProperties:]] Invalid account type: Fax";
  const std::string ignoring = "Ignoring unknown child account with properties ";
  EXPECT_EQ(
      device.logLines(),
      (Lines{line, line, ignoring + "{Class = C; Identifier = 1; Type = Fax}", ignoring + "text"}));
}

TEST_F(ChildMutations, AdditionAppendsTheChildsOwnProperties) {
  setUp({accountInfo("1")});
  parent->setAccountPropertyForKey("Home", "DisplayName");
  const AccountPtr child = record(accountInfo("2", "CardDAV"));
  child->setParentAccount(parent);
  EXPECT_EQ(child->displayName(), "Home");
  store->addChildToAccount(child, parent);
  EXPECT_EQ(children(), Value(Array{accountInfo("1"), accountInfo("2", "CardDAV")}));
  EXPECT_EQ(store->children(), (Lines{"1 of p", "2 of p"}));
  expectIndexFollowsTheList();
}

TEST_F(ChildMutations, AdditionMakesTheListWhereThereIsNone) {
  setUp({});
  parent->removeAccountPropertyForKey("ChildAccounts");
  store->addChildToAccount(record(accountInfo("1")), parent);
  EXPECT_EQ(children(), Value(Array{accountInfo("1")}));
  expectIndexFollowsTheList();
}

TEST_F(ChildMutations, AddingTwiceGivesTwoEntries) {
  setUp({});
  const AccountPtr child = record(accountInfo("1"));
  store->addChildToAccount(child, parent);
  store->addChildToAccount(child, parent);
  EXPECT_EQ(children(), Value(Array{accountInfo("1"), accountInfo("1")}));
  EXPECT_EQ(store->children(), (Lines{"1 of p"}));
}

TEST_F(ChildMutations, RegisteredChildIsANewRecordOfTheParentObject) {
  setUp({});
  const AccountPtr child = record(accountInfo("1"));
  store->addChildToAccount(child, parent);
  const AccountPtr registered = store->childAccountsByID().at("1");
  EXPECT_NE(registered, child);
  EXPECT_EQ(registered->parentAccount(), parent);
  EXPECT_EQ(child->parentAccount(), nullptr);
  child->setAccountPropertyForKey(1, "n");
  EXPECT_EQ(children(), Value(Array{accountInfo("1")}));
}

}  // namespace
}  // namespace accountsettings
