#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr const char* kIgnoring = "Ignoring unknown child account with properties ";

// An account whose identifier is no text, so that it answers none.
Dictionary namelessInfo(std::string_view type = "CalDAV", const Array& children = {}) {
  Dictionary info = with(accountInfo("", type), "Identifier", 5);
  if (!children.empty()) info.set("ChildAccounts", children);
  return info;
}

Dictionary parentInfo(std::string_view identifier, const Array& children) {
  return accountInfo(identifier, "CalDAV", {{"ChildAccounts", children}});
}

AccountPtr record(const Dictionary& info) { return ASSBasicAccount::initWithProperties(info); }

// Such accounts are listed and saved, and never found by an identifier.
class NamelessAccounts : public ::testing::Test {
 protected:
  AccountArray listed() const { return *store->allBasicAccounts(); }
  AccountsDevice device;
  std::shared_ptr<OpenStore> store = OpenStore::ofAccounts(
      {namelessInfo("CalDAV", {accountInfo("c")}), accountInfo("b"), namelessInfo("CardDAV")});
};

TEST_F(NamelessAccounts, AreListedWithoutTheirChildren) {
  EXPECT_EQ(store->count(), 3U);
  EXPECT_EQ(store->children(), Lines());
  EXPECT_EQ(device.logLines(),
            (Lines{std::string(kIgnoring) + "{Class = C; Identifier = c; Type = CalDAV}",
                   "<ASSBasicAccount: (null)> returned a nil identifier. Account properties may "
                   "not get saved",
                   "<ASSBasicAccount: (null)> returned a nil identifier. Account properties may "
                   "not get saved"}));
}

TEST_F(NamelessAccounts, AreInsertedEachTime) {
  const AccountPtr account = record(namelessInfo());
  store->insertAccount(account);
  store->insertAccount(account);
  ASSERT_EQ(store->count(), 5U);
  EXPECT_EQ(listed()[3], account);
  EXPECT_EQ(listed()[4], account);
}

TEST_F(NamelessAccounts, AreNeitherUpdatedNorDeleted) {
  const AccountArray before = listed();
  store->updateAccount(record(namelessInfo()));
  store->deleteAccount(before[0]);
  EXPECT_EQ(listed(), before);
}

TEST_F(NamelessAccounts, AreReplacedWhereTheyStand) {
  const AccountPtr replacement = record(parentInfo("n", {accountInfo("d")}));
  store->replaceAccountWithAccount(listed()[0], replacement);
  EXPECT_EQ(listed()[0], replacement);
  EXPECT_EQ(store->children(), (Lines{"d of n"}));
}

TEST_F(NamelessAccounts, GoWithTheirTypeAndComeBehindWhatStays) {
  const AccountArray before = listed();
  const AccountPtr account = record(namelessInfo());
  store->replaceAccountsWithTypesWithAccounts({"CardDAV"}, {account});
  EXPECT_EQ(listed(), (AccountArray{before[0], before[1], account}));
  EXPECT_EQ(store->accountWithIdentifier("b"), before[1]);
}

TEST_F(NamelessAccounts, ComeIntoTheirParentAndAreNoChildren) {
  const AccountPtr child = record(namelessInfo());
  child->setParentAccount(listed()[1]);
  child->properties().set("Identifier", 5);
  store->replaceAccountsWithTypesWithAccounts({}, {child});
  EXPECT_EQ(store->count(), 3U);
  EXPECT_EQ(listed()[1]->properties(),
            with(accountInfo("b"), "ChildAccounts", Array{namelessInfo()}));
  EXPECT_EQ(store->children(), Lines());
}

TEST(AccountsWithoutIdentifiers, AreLikeThoseWhoseIdentifierIsNoText) {
  AccountsDevice device;
  device.uuidGenerator.failEvery("generateUUID");
  Dictionary info = accountInfo("");
  info.remove("Identifier");
  const auto store = OpenStore::ofAccounts({accountInfo("a")});
  const AccountPtr account = record(info);
  EXPECT_EQ(account->identifier(), std::nullopt);
  store->replaceAccountsWithTypesWithAccounts({}, {account});
  EXPECT_EQ(store->count(), 2U);
  EXPECT_EQ((*store->allBasicAccounts())[1], account);
}

TEST(AccountsWithoutIdentifiers, DeviceLocalAccountHasChildrenAllTheSame) {
  AccountsDevice device;
  device.uuidGenerator.failEvery("generateUUID");
  Dictionary info = accountInfo("", "OnMyDevice", {{"ChildAccounts", Array{accountInfo("c")}}});
  info.remove("Identifier");
  EXPECT_EQ(OpenStore::ofAccounts({info})->children(), (Lines{"c of DeviceLocalAccount"}));
}

TEST(ChildrenOfTwoParents, AreGoneWithTheLastOne) {
  AccountsDevice device;
  const auto store = OpenStore::ofAccounts(
      {parentInfo("p", {accountInfo("c")}), parentInfo("q", {accountInfo("c")})});
  store->deleteAccountWithIdentifier("q");
  EXPECT_EQ(store->children(), Lines());
  store->deleteAccountWithIdentifier("p");
  EXPECT_EQ(store->children(), Lines());
}

}  // namespace
}  // namespace accountsettings
