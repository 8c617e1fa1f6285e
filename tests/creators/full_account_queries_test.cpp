#include "tests/creators/CreatorsDevice.h"
#include "tests/creators/Diary.h"

namespace accountsettings {
namespace {

// Every type's full accounts are made by the record, so that the diary shows whose were made.
class FullAccountQueries : public testing::Test {
 protected:
  FullAccountQueries() {
    Dictionary creators;
    for (const char* type : {"CalDAV", "Mail", "Quillnet", "Gmail", "Yahoo", "SMTP"})
      creators.set(type, Array{creator("FullAccount", kFullAccounts, "MakingCreator")});
    device.setCreators(creators);
  }
  // The identifiers of the records that full accounts were made of, in order.
  static Lines made() {
    Lines identifiers;
    const std::string prefix = "accountWithBasicAccount(";
    for (const std::string& line : diaryLines()) {
      if (line.starts_with(prefix))
        identifiers.push_back(line.substr(prefix.size(), line.size() - prefix.size() - 1));
    }
    return identifiers;
  }
  CreatorsDevice device;
};

// Of a class that the store's own fixer leaves alone.
Dictionary mailInfo(std::string_view identifier, std::string_view type = "Mail",
                    const Dictionary& more = {}) {
  return with(accountInfo(identifier, type, more), "Class", "IMAPAccount");
}

Dictionary withChildren(const Array& children) { return {{"ChildAccounts", children}}; }

TEST_F(FullAccountQueries, FindNothingForAnEmptyOrUnknownIdentifier) {
  // An account with the empty identifier does not count either.
  const auto store = OpenStore::ofAccounts({accountInfo("1"), accountInfo("")});
  ASSERT_NE(store->accountWithIdentifier(""), nullptr);
  NotingLoader loader(false);
  EXPECT_EQ(store->fullAccountWithIdentifierLoader("", &loader), nullptr);
  EXPECT_EQ(store->fullAccountWithIdentifierLoader("unknown", &loader), nullptr);
  EXPECT_EQ(loader.asked, Lines{});
  EXPECT_FALSE(fullAccountsAreLoaded());
}

TEST_F(FullAccountQueries, AnswerAChildsOwnFullAccountAndPassTheLoaderOn) {
  const auto store =
      OpenStore::ofAccounts({accountInfo("p", "CalDAV", withChildren({accountInfo("c", "SMTP")}))});
  NotingLoader loader(false);
  const FullAccountPtr parent = store->fullAccountWithIdentifierLoader("p", &loader);
  const FullAccountPtr child = store->fullAccountWithIdentifierLoader("c", &loader);
  EXPECT_NE(parent, nullptr);
  EXPECT_NE(child, nullptr);
  EXPECT_NE(parent, child);
  EXPECT_EQ(store->accountWithIdentifier("p")->fullAccountUsingLoader(nullptr), parent);
  EXPECT_EQ(loader.asked, (Lines{"p", "c"}));
  EXPECT_EQ(made(), (Lines{"p", "c"}));
}

TEST_F(FullAccountQueries, ListEachAccountOfTheTypesFollowedByItsChildren) {
  const auto store = OpenStore::ofAccounts(
      {mailInfo("b", "Mail", withChildren({accountInfo("b2", "SMTP"), mailInfo("b1", "Mail")})),
       accountInfo("x"), mailInfo("a", "Mail", withChildren({mailInfo("a1", "Mail")}))});
  EXPECT_EQ(store->accountsWithTypes({"Mail"}).size(), 4U);
  EXPECT_EQ(made(), (Lines{"b", "b1", "a", "a1"}));
}

TEST_F(FullAccountQueries, ListAChildWhoseParentIsOfAnotherType) {
  const auto store = OpenStore::ofAccounts(
      {mailInfo("1", "Mail", withChildren({accountInfo("c", "SMTP")})), accountInfo("2")});
  NotingLoader loader(false);
  const std::vector<FullAccountPtr> accounts =
      store->accountsWithTypesWithLoader({"SMTP"}, &loader);
  ASSERT_EQ(accounts.size(), 1U);
  EXPECT_EQ(accounts[0], store->fullAccountWithIdentifierLoader("c", nullptr));
  EXPECT_EQ(loader.asked, Lines{"c"});
}

TEST_F(FullAccountQueries, CountAChildOnlyUnderTheVeryObjectThatIsItsParent) {
  const auto store =
      OpenStore::ofAccounts({accountInfo("p", "CalDAV", withChildren({accountInfo("c", "SMTP")}))});
  // Equal to the parent, and another object.
  const AccountPtr child = store->childAccountsByID().at("c");
  child->setParentAccount(ASSBasicAccount::initWithProperties(accountInfo("p")));
  EXPECT_EQ(store->accountsWithTypes({"SMTP"}).size(), 0U);
  child->setParentAccount(store->accountWithIdentifier("p"));
  EXPECT_EQ(store->accountsWithTypes({"SMTP"}).size(), 1U);
}

TEST_F(FullAccountQueries, LeaveOutAMatchingChildThatHasNone) {
  const auto store = OpenStore::ofAccounts({accountInfo(
      "p", "CalDAV", withChildren({accountInfo("", "SMTP"), accountInfo("c", "SMTP")}))});
  ASSERT_EQ(store->children(), (Lines{" of p", "c of p"}));
  const std::vector<FullAccountPtr> accounts = store->accountsWithTypes({"SMTP"});
  ASSERT_EQ(accounts.size(), 1U);
  EXPECT_EQ(accounts[0], store->fullAccountWithIdentifierLoader("c", nullptr));
  EXPECT_EQ(made(), Lines{"c"});
}

// A loader that deletes the accounts from the store, and looks at its argument afterwards.
class DeletingLoader : public FullAccountLoader {
 public:
  explicit DeletingLoader(OpenStore& store, StringList identifiers)
      : _store(store), _identifiers(std::move(identifiers)) {}
  bool loadBundleForAccountWithProperties(const Dictionary& properties) override {
    for (const std::string& identifier : _identifiers)
      _store.deleteAccountWithIdentifier(identifier);
    asked.emplace_back(*properties.find("Identifier")->asString());
    return false;
  }
  Lines asked;

 private:
  OpenStore& _store;
  StringList _identifiers;
};

TEST_F(FullAccountQueries, KeepAnAccountThatItsLoaderDeletes) {
  const auto store = OpenStore::ofAccounts({accountInfo("1")});
  DeletingLoader loader(*store, {"1"});
  EXPECT_NE(store->fullAccountWithIdentifierLoader("1", &loader), nullptr);
  EXPECT_EQ(loader.asked, Lines{"1"});
  EXPECT_EQ(store->count(), 0U);
}

TEST_F(FullAccountQueries, ListWhatWasThereWhenALoaderDeletesIt) {
  const auto store = OpenStore::ofAccounts(
      {mailInfo("x", "Mail", withChildren({accountInfo("c", "CalDAV")})), accountInfo("1")});
  DeletingLoader loader(*store, {"x"});
  EXPECT_EQ(store->accountsWithTypesWithLoader({"CalDAV"}, &loader).size(), 2U);
  EXPECT_EQ(loader.asked, (Lines{"c", "1"}));
}

TEST_F(FullAccountQueries, AnswerTheStoresOwnRecordAsTheDeviceLocalAccount) {
  device.setCreators(
      {{"OnMyDevice", Array{creator("FullAccount", kFullAccounts, "MakingCreator")}}});
  const auto store = OpenStore::ofAccounts({accountInfo("1", "OnMyDevice")});
  const AccountPtr local = store->fullDeviceLocalAccount();
  EXPECT_EQ(local, (*store->allBasicAccounts())[0]);
  EXPECT_EQ(made(), Lines{});
  EXPECT_FALSE(fullAccountsAreLoaded());
  EXPECT_EQ(
      device.countOfFileCalls("readPropertyListFile(" + device.resourcePath("AccountCreators")),
      0U);
}

TEST_F(FullAccountQueries, RaiseForAListedAccountThatCannotBeFoundByItsIdentifier) {
  const auto store = OpenStore::ofAccounts({mailInfo("1", "Mail")});
  store->replaceAccountWithAccount(store->accountWithIdentifier("1"),
                                   ASSBasicAccount::initWithProperties(mailInfo("2", "Mail")));
  expectAssertionFailure("<ASSBasicAccount: 2> has no full account", "ASSAccountsManager",
                         [&] { store->accountsWithTypes({"Mail"}); });
}

TEST_F(FullAccountQueries, ListMailAccountsInTheOrderOfTheFile) {
  const auto store = OpenStore::ofAccounts(
      {accountInfo("yahoo", "Yahoo"), accountInfo("calendars"),
       accountInfo("gmail", "Gmail", withChildren({mailInfo("child", "Mail")})),
       mailInfo("quillnet", "Quillnet"), accountInfo("sender", "SMTP"), mailInfo("mail", "Mail")});
  EXPECT_EQ(store->allMailAccounts().size(), 5U);
  EXPECT_EQ(made(), (Lines{"yahoo", "gmail", "child", "quillnet", "mail"}));
  EXPECT_EQ(device.logLines(), Lines{});
}

}  // namespace
}  // namespace accountsettings
