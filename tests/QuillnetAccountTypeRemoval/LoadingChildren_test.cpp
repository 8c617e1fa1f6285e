#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr const char* kIgnoring = "Ignoring unknown child account with properties ";

Dictionary parentInfo(std::string_view identifier, const Array& children) {
  return accountInfo(identifier, "CalDAV", {{"ChildAccounts", children}});
}

class LoadingChildren : public ::testing::Test {
 protected:
  AccountsDevice device;
};

TEST_F(LoadingChildren, RegistersEachChildUnderItsParent) {
  const auto store =
      OpenStore::ofAccounts({parentInfo("p", {accountInfo("c1"), accountInfo("c2", "CardDAV")}),
                             parentInfo("q", {accountInfo("c3")})});
  EXPECT_EQ(store->children(), (Lines{"c1 of p", "c2 of p", "c3 of q"}));
  EXPECT_EQ(store->childAccountsByID().at("c2")->properties(), accountInfo("c2", "CardDAV"));
  EXPECT_EQ(store->childAccountsByID().at("c1")->parentAccount(),
            store->accountWithIdentifier("p"));
  EXPECT_EQ(store->childAccountsByID().at("c3")->parentAccount(),
            store->accountWithIdentifier("q"));
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(LoadingChildren, AreInNoListOfTopLevelAccountsAndInNoSnapshot) {
  const auto store = OpenStore::ofAccounts({parentInfo("p", {accountInfo("c1")})});
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"p"}));
  EXPECT_EQ(store->originalAccountsByID().size(), 1U);
  EXPECT_TRUE(store->originalAccountsByID().contains("p"));
}

TEST_F(LoadingChildren, ChildIsAlwaysAPlainRecord) {
  const auto store = OpenStore::ofAccounts({parentInfo("p", {accountInfo("c", "OnMyDevice")})});
  EXPECT_EQ(store->childAccountsByID().at("c")->className(), "ASSBasicAccount");
}

// Its identifier is always the same, whatever is stored.
TEST_F(LoadingChildren, OfTheDeviceLocalAccountAreUnderTheIdentifierThatItAnswers) {
  for (const Value& stored : {Value(5), Value("DeviceLocalAccount"), Value("p")}) {
    const auto store = OpenStore::ofAccounts(
        {with(accountInfo("", "OnMyDevice", {{"ChildAccounts", Array{accountInfo("c")}}}),
              "Identifier", stored),
         parentInfo("p", {accountInfo("d")})});
    EXPECT_EQ(store->children(), (Lines{"c of DeviceLocalAccount", "d of p"}));
    EXPECT_EQ(store->accountWithIdentifier("c"), (*store->allBasicAccounts())[0]);
    store->deleteAccountWithIdentifier("p");
    EXPECT_EQ(store->children(), (Lines{"c of DeviceLocalAccount"}));
    store->deleteAccountWithIdentifier("DeviceLocalAccount");
    EXPECT_EQ(store->children(), Lines());
  }
}

TEST_F(LoadingChildren, IgnoresAndNamesWhatMakesNoRecord) {
  const auto store = OpenStore::ofAccounts(
      {parentInfo("p", {Dictionary{{"Identifier", "c1"}, {"Type", "Fax"}, {"Class", "C"}}, 5,
                        accountInfo("good")})});
  EXPECT_EQ(store->children(), (Lines{"good of p"}));
  EXPECT_EQ(device.logLines(),
            (Lines{"[-[ASSBasicAccount initWithProperties:]] Invalid account type: Fax",
                   std::string(kIgnoring) + "{Class = C; Identifier = c1; Type = Fax}",
                   std::string(kIgnoring) + "5"}));
}

TEST_F(LoadingChildren, IgnoresAndNamesAChildWithoutAnIdentifierOfItsOwn) {
  const auto store = OpenStore::ofAccounts(
      {parentInfo("p", {Dictionary{{"Type", "CalDAV"}, {"Class", "C"}}, accountInfo("good"),
                        accountInfo("", "CalDAV", {{"Identifier", 7}})})});
  EXPECT_EQ(store->children(), (Lines{"good of p"}));
  EXPECT_EQ(device.logLines(),
            (Lines{std::string(kIgnoring) + "{Class = C; Type = CalDAV}",
                   std::string(kIgnoring) + "{Class = C; Identifier = 7; Type = CalDAV}"}));
}

TEST_F(LoadingChildren, AreNotFixed) {
  const Dictionary child =
      accountInfo("c", "Mail", {{"Class", "Old"}, {"AccountPath", "Mail/POP-x"}});
  const auto store = OpenStore::ofAccounts({parentInfo("p", {child})});
  EXPECT_EQ(store->childAccountsByID().at("c")->properties(), child);
}

TEST_F(LoadingChildren, HaveNoChildrenThemselves) {
  const auto store =
      OpenStore::ofAccounts({parentInfo("p", {parentInfo("c", {accountInfo("grandchild")})})});
  EXPECT_EQ(store->children(), (Lines{"c of p"}));
}

TEST_F(LoadingChildren, SurviveAListThatIsNone) {
  const auto store = OpenStore::ofAccounts(
      {accountInfo("p", "CalDAV", {{"ChildAccounts", Dictionary{{"c", accountInfo("c")}}}}),
       accountInfo("q", "CalDAV", {{"ChildAccounts", "x"}})});
  EXPECT_EQ(store->children(), Lines());
  EXPECT_EQ(store->count(), 2U);
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(LoadingChildren, LoadingAgainLeavesOneSetAsTheParentHasItNow) {
  const auto store =
      OpenStore::ofAccounts({parentInfo("p", {accountInfo("c1"), accountInfo("c2")})});
  const AccountPtr parent = store->accountWithIdentifier("p");
  store->_loadChildrenFromAccount(parent);
  EXPECT_EQ(store->children(), (Lines{"c1 of p", "c2 of p"}));
  parent->setAccountPropertyForKey(Array{accountInfo("c3")}, "ChildAccounts");
  store->_loadChildrenFromAccount(parent);
  EXPECT_EQ(store->children(), (Lines{"c3 of p"}));
  parent->setAccountPropertyForKey(std::nullopt, "ChildAccounts");
  store->_loadChildrenFromAccount(parent);
  EXPECT_EQ(store->children(), Lines());
}

TEST_F(LoadingChildren, RemovalTakesThoseOfOneParentOnly) {
  const auto store = OpenStore::ofAccounts({parentInfo("p", {accountInfo("c1"), accountInfo("c2")}),
                                            parentInfo("q", {accountInfo("c3")})});
  const AccountPtr held = store->childAccountsByID().at("c1");
  store->_removeChildrenForAccountWithIdentifier("nobody");
  store->_removeChildrenForAccountWithIdentifier(std::nullopt);
  EXPECT_EQ(store->children(), (Lines{"c1 of p", "c2 of p", "c3 of q"}));
  store->_removeChildrenForAccountWithIdentifier("p");
  EXPECT_EQ(store->children(), (Lines{"c3 of q"}));
  EXPECT_EQ(held->identifier(), "c1");
  EXPECT_EQ(held->parentAccountIdentifier(), "p");
}

TEST_F(LoadingChildren, ChildOfTwoParentsBelongsToTheOneLoadedLast) {
  const auto store = OpenStore::ofAccounts(
      {parentInfo("p", {accountInfo("c")}), parentInfo("q", {accountInfo("c")})});
  EXPECT_EQ(store->children(), (Lines{"c of q"}));
  store->_removeChildrenForAccountWithIdentifier("p");
  EXPECT_EQ(store->children(), (Lines{"c of q"}));
  store->_removeChildrenForAccountWithIdentifier("q");
  EXPECT_EQ(store->children(), Lines());
}

TEST_F(LoadingChildren, OfTwoEntriesOfOneParentTheLaterCounts) {
  const auto store = OpenStore::ofAccounts({parentInfo(
      "p", {accountInfo("c", "CalDAV", {{"n", 1}}), accountInfo("c", "CalDAV", {{"n", 2}})})});
  EXPECT_EQ(store->children(), (Lines{"c of p"}));
  EXPECT_EQ(*store->childAccountsByID().at("c")->accountPropertyForKey("n"), Value(2));
}

}  // namespace
}  // namespace accountsettings
