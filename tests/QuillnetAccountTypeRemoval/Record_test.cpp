#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

class Record : public ::testing::Test {
 protected:
  AccountsDevice device;
};

// A child without properties of its own but the class and type that a record needs.
std::shared_ptr<OpenAccount> childOf(const AccountPtr& parent, const Dictionary& more = {}) {
  auto child = OpenAccount::initWithProperties(accountInfo("child", "CalDAV", more));
  child->setParentAccount(parent);
  return child;
}

TEST_F(Record, AnswersItsOwnValueElseTheNearestAncestors) {
  const AccountPtr grandparent = ASSBasicAccount::initWithProperties(
      accountInfo("g", "CalDAV", {{"a", "g"}, {"b", "g"}, {"c", "g"}}));
  const AccountPtr parent = childOf(grandparent, {{"a", "p"}, {"b", "p"}});
  const AccountPtr child = childOf(parent, {{"a", "c"}});
  EXPECT_EQ(*child->accountPropertyForKey("a"), Value("c"));
  EXPECT_EQ(*child->accountPropertyForKey("b"), Value("p"));
  EXPECT_EQ(*child->accountPropertyForKey("c"), Value("g"));
  EXPECT_EQ(child->accountPropertyForKey("d"), nullptr);
}

TEST_F(Record, SetterIgnoresTypeAndClassAlsoWithoutAValue) {
  const AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo("1"));
  account->setAccountPropertyForKey("Mail", "Type");
  account->setAccountPropertyForKey("Other", "Class");
  account->setAccountPropertyForKey(std::nullopt, "Type");
  account->setAccountPropertyForKey(std::nullopt, "Class");
  EXPECT_EQ(account->properties(), accountInfo("1"));
}

TEST_F(Record, SetterStoresAValueAndRemovesTheKeyWithoutOne) {
  const AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo("1"));
  account->setAccountPropertyForKey(5, "n");
  EXPECT_EQ(account->properties(), with(accountInfo("1"), "n", 5));
  account->setAccountPropertyForKey(std::nullopt, "n");
  EXPECT_EQ(account->properties(), accountInfo("1"));
}

TEST_F(Record, ForcedSetterChangesAndRemovesTypeAndClass) {
  const auto account = OpenAccount::initWithProperties(accountInfo("1"));
  account->_forcedSetAccountPropertyForKey("Mail", "Type");
  account->_forcedSetAccountPropertyForKey("Other", "Class");
  EXPECT_EQ(account->type(), "Mail");
  EXPECT_EQ(account->accountClass(), "Other");
  account->_forcedSetAccountPropertyForKey(std::nullopt, "Type");
  account->_forcedSetAccountPropertyForKey(std::nullopt, "Class");
  EXPECT_EQ(account->properties(), (Dictionary{{"Identifier", "1"}}));
}

TEST_F(Record, RemovalTakesAnyOwnKeyAndLeavesTheParentsAlone) {
  const AccountPtr parent =
      ASSBasicAccount::initWithProperties(accountInfo("p", "CalDAV", {{"n", 1}}));
  const AccountPtr child = childOf(parent, {{"n", 2}});
  for (const char* key : {"Type", "Class", "n", "never there"})
    child->removeAccountPropertyForKey(key);
  EXPECT_EQ(child->properties(), (Dictionary{{"Identifier", "child"}}));
  EXPECT_EQ(parent->properties(), accountInfo("p", "CalDAV", {{"n", 1}}));
}

TEST_F(Record, PropertiesAreLiveInBothDirections) {
  const AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo("1"));
  Dictionary& properties = account->properties();
  account->setAccountPropertyForKey(1, "through the setter");
  EXPECT_TRUE(properties.contains("through the setter"));
  properties.set("through the reference", 2);
  EXPECT_EQ(*account->accountPropertyForKey("through the reference"), Value(2));
  EXPECT_EQ(account->propertiesToSave(), properties);
}

TEST_F(Record, OriginalPropertiesAreACopyOfTheirOwnAtEveryDepth) {
  const AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo("1"));
  Array nested = {Dictionary{{"deep", 1}}};
  Dictionary given{{"list", nested}};
  account->setOriginalProperties(given);
  nested.append(2);
  given.set("list", nested);
  given.set("more", 3);
  EXPECT_EQ(account->originalProperties(), (Dictionary{{"list", Array{Dictionary{{"deep", 1}}}}}));
}

TEST_F(Record, SettingTheOriginalPropertiesItHoldsKeepsThem) {
  const AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo("1"));
  account->setOriginalProperties(account->originalProperties());
  EXPECT_EQ(account->originalProperties(), accountInfo("1"));
}

TEST_F(Record, AccessorsReadTheirKeys) {
  const AccountPtr account = ASSBasicAccount::initWithProperties({{"Type", "CalDAV"},
                                                                  {"Class", "CalDAVAccount"},
                                                                  {"Identifier", "id"},
                                                                  {"Sync Identifier", "sync"},
                                                                  {"DisplayName", "Home"},
                                                                  {"Type String", "long"},
                                                                  {"Short Type String", "short"}});
  EXPECT_EQ(account->type(), "CalDAV");
  EXPECT_EQ(account->accountClass(), "CalDAVAccount");
  EXPECT_EQ(account->identifier(), "id");
  EXPECT_EQ(account->syncStoreIdentifier(), "sync");
  EXPECT_EQ(account->displayName(), "Home");
  EXPECT_EQ(account->typeString(), "long");
  EXPECT_EQ(account->shortTypeString(), "short");
}

TEST_F(Record, AccessorsOfAChildFallBackToItsParent) {
  const AccountPtr parent = ASSBasicAccount::initWithProperties({{"Type", "CalDAV"},
                                                                 {"Class", "ParentClass"},
                                                                 {"Identifier", "p"},
                                                                 {"Sync Identifier", "sync"},
                                                                 {"DisplayName", "Home"},
                                                                 {"Type String", "long"},
                                                                 {"Short Type String", "short"}});
  const AccountPtr child = childOf(parent);
  child->properties() = Dictionary();
  EXPECT_EQ(child->type(), "CalDAV");
  EXPECT_EQ(child->accountClass(), "ParentClass");
  EXPECT_EQ(child->identifier(), "p");
  EXPECT_EQ(child->syncStoreIdentifier(), "sync");
  EXPECT_EQ(child->displayName(), "Home");
  EXPECT_EQ(child->typeString(), "long");
  EXPECT_EQ(child->shortTypeString(), "short");
}

TEST_F(Record, AccessorsAnswerNothingWhereNobodyHasAString) {
  const AccountPtr account =
      ASSBasicAccount::initWithProperties(accountInfo("1", "CalDAV", {{"DisplayName", 7}}));
  EXPECT_EQ(account->displayName(), std::nullopt);
  EXPECT_EQ(account->syncStoreIdentifier(), std::nullopt);
}

TEST_F(Record, ClassIsWrittenPastTheGuardWhenItDiffers) {
  const AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo("1"));
  account->setAccountClass("Other");
  EXPECT_EQ(account->properties(), with(accountInfo("1"), "Class", "Other"));
}

TEST_F(Record, ClassIsComparedWithTheInheritedOne) {
  const AccountPtr parent = ASSBasicAccount::initWithProperties(accountInfo("p"));
  const AccountPtr child = childOf(parent);
  child->removeAccountPropertyForKey("Class");
  child->setAccountClass("C");
  EXPECT_FALSE(child->properties().contains("Class"));
  child->setAccountClass("D");
  EXPECT_EQ(*child->properties().find("Class"), Value("D"));
}

TEST_F(Record, DisplayNameIsComparedWithTheOwnOneOnly) {
  const AccountPtr parent =
      ASSBasicAccount::initWithProperties(accountInfo("p", "CalDAV", {{"DisplayName", "Home"}}));
  const AccountPtr child = childOf(parent);
  child->setDisplayName("Home");
  EXPECT_EQ(*child->properties().find("DisplayName"), Value("Home"));
  child->setDisplayName("Work");
  EXPECT_EQ(*child->properties().find("DisplayName"), Value("Work"));
  EXPECT_EQ(parent->displayName(), "Home");
}

TEST_F(Record, EqualNameOrClassLeavesThePropertiesUntouched) {
  const AccountPtr account =
      ASSBasicAccount::initWithProperties(accountInfo("1", "CalDAV", {{"DisplayName", "Home"}}));
  account->setDisplayName("Home");
  account->setAccountClass("C");
  EXPECT_TRUE(account->properties().sharesStorageWith(account->originalProperties()));
}

TEST_F(Record, HoldsItsParentAndReleasesTheFormerOne) {
  AccountPtr first = ASSBasicAccount::initWithProperties(accountInfo("first"));
  const std::weak_ptr<ASSBasicAccount> watched = first;
  const AccountPtr child = childOf(first);
  first = nullptr;
  EXPECT_FALSE(watched.expired());
  EXPECT_EQ(child->parentAccountIdentifier(), "first");
  const AccountPtr second = ASSBasicAccount::initWithProperties(accountInfo("second"));
  child->setParentAccount(second);
  EXPECT_TRUE(watched.expired());
  EXPECT_EQ(child->parentAccount(), second);
  child->setParentAccount(nullptr);
  EXPECT_EQ(child->parentAccount(), nullptr);
  EXPECT_EQ(child->parentAccountIdentifier(), std::nullopt);
}

TEST_F(Record, DescribesItselfByClassAndIdentifierAlone) {
  const AccountPtr account =
      ASSBasicAccount::initWithProperties(accountInfo("1", "CalDAV", {{"Username", "ada"}}));
  EXPECT_EQ(account->description(), "<ASSBasicAccount: 1>");
  account->removeAccountPropertyForKey("Identifier");
  EXPECT_EQ(account->description(), "<ASSBasicAccount: (null)>");
}

TEST_F(Record, EqualPropertiesDoNotMakeTwoRecordsOne) {
  const AccountPtr one = ASSBasicAccount::initWithProperties(accountInfo("1"));
  const AccountPtr other = ASSBasicAccount::initWithProperties(accountInfo("1"));
  EXPECT_NE(one, other);
}

// A string that notes its end.
Value mortal(Lines& ends, const std::string& name) {
  return Value(
      std::shared_ptr<const std::string>(new std::string(name), [&ends](const std::string* text) {
        ends.push_back(*text);
        delete text;
      }));
}

// A full account that notes its end.
class MortalFullAccount : public AccountFullAccountProtocol {
 public:
  explicit MortalFullAccount(Lines& ends) : _ends(ends) {}
  ~MortalFullAccount() override { _ends.push_back("full account"); }
  void setParentAccount(const AccountPtr&) override {}

 private:
  Lines& _ends;
};

TEST_F(Record, ReleasesParentThenOriginalPropertiesThenPropertiesThenFullAccount) {
  Lines ends;
  AccountPtr parent = ASSBasicAccount::initWithProperties(accountInfo("p"));
  parent->setOriginalProperties({});
  parent->setAccountPropertyForKey(mortal(ends, "parent"), "k");
  AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo("1"));
  account->setParentAccount(std::exchange(parent, nullptr));
  account->setOriginalProperties({{"k", mortal(ends, "original properties")}});
  account->setAccountPropertyForKey(mortal(ends, "properties"), "k");
  account->setFullAccount(std::make_shared<MortalFullAccount>(ends));
  account = nullptr;
  EXPECT_EQ(ends, (Lines{"parent", "original properties", "properties", "full account"}));
}

class NarrowAccount : public OpenAccount {
 public:
  using OpenAccount::OpenAccount;
  static std::shared_ptr<NarrowAccount> initWithProperties(const Dictionary& properties) {
    return _recordWithProperties<NarrowAccount>(properties);
  }
  const Dictionary& propertiesToSave() const override { return narrowed; }
  Dictionary narrowed{{"Identifier", "1"}, {"narrowed", true}};
};

TEST_F(Record, ASubclassChoosesWhatSnapshotAndSaveTake) {
  const auto account = NarrowAccount::initWithProperties(accountInfo("1"));
  const auto store = OpenStore::ofAccounts({});
  store->insertAccount(account);
  store->_setOriginalAccountDictionaries();
  EXPECT_EQ(store->originalAccountsByID().at("1"), account->narrowed);
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{account->narrowed});
  EXPECT_EQ(account->originalProperties(), account->narrowed);
}

}  // namespace
}  // namespace accountsettings
