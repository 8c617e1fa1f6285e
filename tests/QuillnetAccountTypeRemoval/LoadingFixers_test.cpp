#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/ChosenFixers.h"

namespace accountsettings {
namespace {

class LoadingFixers : public ::testing::Test {
 protected:
  RuntimeFixerPtr fixer(const std::string& name, FixVerdict verdict) {
    return std::make_shared<ChosenFixer>(name, notes,
                                         [verdict](const AccountPtr&) { return verdict; });
  }
  // Loads the accounts "1" and "2" through these fixers.
  std::shared_ptr<StoreWithFixers> loadedThrough(std::vector<RuntimeFixerPtr> fixers) {
    auto store = std::make_shared<StoreWithFixers>(std::move(fixers));
    store->load({accountInfo("1"), accountInfo("2")});
    return store;
  }
  AccountsDevice device;
  Lines notes;
};

TEST_F(LoadingFixers, EachVerdictDecidesAboutRegistrationAndTheFinalCall) {
  const struct {
    const char* name;
    FixVerdict verdict;
    Lines accounts, last;
  } kCases[] = {
      {"nothing to do", FixVerdict::nothingToDo, {"1", "2"}, {}},
      {"fixed", FixVerdict::fixed, {"1", "2"}, {"a: not saved"}},
      {"could not fix", FixVerdict::couldNotFix, {}, {"a: not saved"}},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    notes.clear();
    const auto store = loadedThrough({fixer("a", c.verdict)});
    EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), c.accounts);
    Lines expected = {"a: loading accounts 1", "a: loading accounts 2"};
    expected.insert(expected.end(), c.last.begin(), c.last.end());
    EXPECT_EQ(notes, expected);
    EXPECT_EQ(store->accountWithIdentifier("1") != nullptr, !c.accounts.empty());
  }
}

TEST_F(LoadingFixers, AccountIsRegisteredOnceForEveryFixerThatKeepsIt) {
  const auto store =
      loadedThrough({fixer("a", FixVerdict::nothingToDo), fixer("b", FixVerdict::nothingToDo)});
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"1", "1", "2", "2"}));
  EXPECT_EQ((*store->allBasicAccounts())[0], (*store->allBasicAccounts())[1]);
  EXPECT_EQ(notes, (Lines{"a: loading accounts 1", "b: loading accounts 1", "a: loading accounts 2",
                          "b: loading accounts 2"}));
}

TEST_F(LoadingFixers, AccountIsNeverRegisteredWithoutAFixer) {
  EXPECT_EQ(loadedThrough({})->count(), 0U);
}

TEST_F(LoadingFixers, LaterFixerThatDropsLeavesWhatAnEarlierOneRegistered) {
  const auto store =
      loadedThrough({fixer("a", FixVerdict::nothingToDo), fixer("b", FixVerdict::couldNotFix)});
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"1", "2"}));
  EXPECT_EQ((Lines(notes.end() - 2, notes.end())), (Lines{"a: not saved", "b: not saved"}));
}

TEST_F(LoadingFixers, AccountIsFixedBeforeItIsRegisteredAndItsChildrenLoaded) {
  std::shared_ptr<StoreWithFixers> store;
  const auto look = [&](const AccountPtr& account) {
    EXPECT_EQ(store->accountWithIdentifier(*account->identifier()), nullptr);
    EXPECT_TRUE(store->children().empty());
    account->setAccountPropertyForKey(Array{accountInfo("given by the fixer")}, "ChildAccounts");
    return FixVerdict::fixed;
  };
  store = std::make_shared<StoreWithFixers>(
      std::vector<RuntimeFixerPtr>{std::make_shared<ChosenFixer>("a", notes, look)});
  store->load({accountInfo("1")});
  EXPECT_EQ(store->children(), (Lines{"given by the fixer of 1"}));
}

TEST_F(LoadingFixers, SnapshotHasTheFixedClassAndTheOriginalPropertiesTheLoadedOne) {
  const Dictionary loaded =
      accountInfo("1", "Mail", {{"Class", "Old"}, {"AccountPath", "Mail/POP-x"}});
  const auto store = OpenStore::ofAccounts({loaded});
  const AccountPtr account = store->accountWithIdentifier("1");
  EXPECT_EQ(account->accountClass(), "POPAccount");
  EXPECT_EQ(store->originalAccountsByID().at("1"), with(loaded, "Class", "POPAccount"));
  EXPECT_EQ(account->originalProperties(), loaded);
}

TEST_F(LoadingFixers, LoadNeverTellsTheMailApplicationAndForgetsWhatItFixed) {
  device.writeAccounts({accountInfo("1", "Mail", {{"Class", "Old"}, {"AccountPath", "Mail/POP-x"}}),
                        accountInfo("2", "Mail", {{"Class", "Old"}})});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"1"}));
  store->saveAllAccounts();  // nothing to fix any more: the flag of the load is gone
  for (const std::string& call : device.preferences.calls())
    EXPECT_FALSE(call.starts_with("postPreferencesChanged")) << call;
}

TEST_F(LoadingFixers, ServiceAccountWhoseClassCannotBeFoundIsLeftOutAndGoesWithTheNextSave) {
  const Dictionary lost = accountInfo("1", "Quillnet", {{"Class", "Old"}});
  device.writeAccounts({lost, accountInfo("2")});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"2"}));
  EXPECT_EQ(device.logLines(), (Lines{"Could not fix the class of the mail account: {Class = Old; "
                                      "Identifier = 1; Type = Quillnet}"}));
  store->saveAllAccounts();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), (Lines{"2"}));
}

TEST_F(LoadingFixers, EveryStoreHasOneFixerOfItsOwn) {
  const auto store = OpenStore::ofAccounts({});
  const std::vector<RuntimeFixerPtr> fixers = store->_createRuntimeFixers();
  const std::vector<RuntimeFixerPtr> others = store->_createRuntimeFixers();
  ASSERT_EQ(fixers.size(), 1U);
  ASSERT_EQ(others.size(), 1U);
  EXPECT_NE(fixers[0], others[0]);
}

}  // namespace
}  // namespace accountsettings
