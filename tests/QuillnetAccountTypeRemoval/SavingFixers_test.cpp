#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/ChosenFixers.h"

namespace accountsettings {
namespace {

// Loads through fixers that leave everything alone, and lets them decide from then on.
class SavingFixers : public ::testing::Test {
 protected:
  std::shared_ptr<StoreWithFixers> loaded(const std::vector<std::string>& names,
                                          const Array& accounts) {
    std::vector<RuntimeFixerPtr> fixers;
    for (const std::string& name : names)
      fixers.push_back(std::make_shared<ChosenFixer>(
          name, notes, [this](const AccountPtr& account) { return verdictOn(account); }));
    auto store = std::make_shared<StoreWithFixers>(fixers);
    store->load(accounts);
    notes.clear();
    return store;
  }
  FixVerdict verdictOn(const AccountPtr& account) const {
    const auto found = verdicts.find(account->identifier().value_or(""));
    return found == verdicts.end() ? FixVerdict::nothingToDo : found->second;
  }
  AccountsDevice device;
  Lines notes;
  std::map<std::string, FixVerdict> verdicts;
};

TEST_F(SavingFixers, AreAskedFromTheLastAccountToTheFirstBeforeTheFileIsRead) {
  const auto store = loaded({"a"}, {accountInfo("1"), accountInfo("2"), accountInfo("3")});
  CallJournal journal;
  device.fileServices.alsoNoteCallsIn(&journal);
  verdicts["1"] = FixVerdict::fixed;
  std::size_t fileCallsAtTheLastQuestion = 99;
  const auto watching = std::make_shared<StoreWithFixers>(std::vector<RuntimeFixerPtr>{
      std::make_shared<ChosenFixer>("w", notes, [&](const AccountPtr&) {
        fileCallsAtTheLastQuestion = journal.size();
        return FixVerdict::nothingToDo;
      })});
  store->saveAllAccounts();
  EXPECT_EQ(notes, (Lines{"a: saving accounts 3", "a: saving accounts 2", "a: saving accounts 1",
                          "a: saved"}));
  watching->load({accountInfo("1")});
  journal.clear();
  watching->saveAllAccounts();
  EXPECT_EQ(fileCallsAtTheLastQuestion, 0U);
  EXPECT_FALSE(journal.empty());
  device.fileServices.alsoNoteCallsIn(nullptr);
}

TEST_F(SavingFixers, AccountWithoutIdentifierThatCannotBeFixedIsStillWritten) {
  device.uuidGenerator.failEvery("generateUUID");
  const Dictionary nameless = without(accountInfo("1"), "Identifier");
  const auto store = loaded({"a"}, {nameless});
  verdicts[""] = FixVerdict::couldNotFix;
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{nameless});
}

TEST_F(SavingFixers, EachAccountGoesThroughEveryFixerInOrder) {
  const auto store = loaded({"a", "b"}, {accountInfo("1")});  // listed once for each fixer
  store->saveAllAccounts();
  EXPECT_EQ(notes, (Lines{"a: saving accounts 1", "b: saving accounts 1", "a: saving accounts 1",
                          "b: saving accounts 1"}));
}

TEST_F(SavingFixers, EveryFixerIsToldWhenAnythingNeededFixing) {
  for (const FixVerdict verdict : {FixVerdict::fixed, FixVerdict::couldNotFix}) {
    const auto store = loaded({"a", "b"}, {accountInfo("1"), accountInfo("2")});
    verdicts["2"] = verdict;
    store->saveAllAccounts();
    EXPECT_EQ((Lines(notes.end() - 2, notes.end())), (Lines{"a: saved", "b: saved"}));
    verdicts.clear();
  }
}

TEST_F(SavingFixers, AreToldAlsoWhenTheSaveFailed) {
  const auto store = loaded({"a"}, {accountInfo("1")});
  verdicts["1"] = FixVerdict::fixed;
  device.fileServices.failEvery("renameFileToFile");
  store->saveAllAccounts();
  EXPECT_EQ(notes, (Lines{"a: saving accounts 1", "a: saved"}));
  EXPECT_EQ(device.readSettingsBytes(), std::nullopt);
}

TEST_F(SavingFixers, AreNotToldWhenNothingNeededFixing) {
  const auto store = loaded({"a"}, {accountInfo("1")});
  store->saveAllAccounts();
  EXPECT_EQ(notes, (Lines{"a: saving accounts 1"}));
}

TEST_F(SavingFixers, AccountThatCannotBeFixedLosesItsPlaceInTheIndexesAndIsStillWritten) {
  const Dictionary dropped =
      accountInfo("1", "CalDAV", {{"ChildAccounts", Array{accountInfo("c")}}});
  const auto store = loaded({"a"}, {dropped, accountInfo("2")});
  verdicts["1"] = FixVerdict::couldNotFix;
  store->saveAllAccounts();
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"1", "2"}));
  EXPECT_EQ(store->accountWithIdentifier("1"), nullptr);
  EXPECT_EQ(store->accountWithIdentifier("c"), nullptr);
  EXPECT_EQ(store->children(), Lines());
  EXPECT_EQ(device.savedAccounts(), (Array{dropped, accountInfo("2")}));
}

TEST_F(SavingFixers, MailAccountBrokenInMemoryIsWrittenOnceMoreAndGoesAtTheNextLoad) {
  const Dictionary good = accountInfo("1", "Mail", {{"Class", "IMAPAccount"}});
  device.writeAccounts({good});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  store->accountWithIdentifier("1")->setAccountClass("Old");
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{with(good, "Class", "Old")});
  EXPECT_EQ(ASSAccountsManager::init()->count(), 0U);
}

TEST_F(SavingFixers, ClassFixedAtLoadIsWrittenAsAChangeInMemoryAndTheMailApplicationNotTold) {
  const Dictionary old =
      accountInfo("1", "Mail", {{"Class", "Old"}, {"AccountPath", "Mail/POP-x"}});
  device.writeAccounts({old});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{with(old, "Class", "POPAccount")});
  EXPECT_EQ(device.preferences.calls(), (CallJournal{"readDefault(ASLoggingEnabled)"}));
}

TEST_F(SavingFixers, ClassFixedAtASaveIsWrittenAndTheMailApplicationTold) {
  const Dictionary good =
      accountInfo("1", "Mail", {{"Class", "IMAPAccount"}, {"AccountPath", "Mail/POP-x"}});
  device.writeAccounts({good});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  store->accountWithIdentifier("1")->setAccountClass("Old");
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{with(good, "Class", "POPAccount")});
  EXPECT_EQ(device.preferences.calls().back(),
            "postPreferencesChanged(com.vantor.mobilemail, MailAccounts)");
}

TEST_F(SavingFixers, SecondLoadOfASaveWritesItsOwnLines) {
  device.writeAccounts(
      {accountInfo("1", "Mail", {{"Class", "Old"}}), Dictionary{{"Type", "Fax"}, {"Class", "C"}}});
  const AccountsManagerPtr store = ASSAccountsManager::init();
  const Lines ofALoad = {
      "Could not fix the class of the mail account: {Class = Old; Identifier = 1; Type = Mail}",
      "[-[ASSBasicAccount initWithProperties:]] Invalid account type: Fax",
      "[-[ASSAccountsManager _initWithAccountsInfo:]] ERROR: Failed to create a ASSBasicAccount "
      "from "
      "{Class = C; Type = Fax}"};
  EXPECT_EQ(device.logLines(), ofALoad);
  device.systemLog.clear();
  store->saveAllAccounts();
  EXPECT_EQ(device.logLines(), ofALoad);
  EXPECT_EQ(device.savedAccounts(), Array());
}

TEST_F(SavingFixers, MemoryThatRunsOutWhileOneFixesFailsTheSave) {
  int calls = 0;
  const auto store = std::make_shared<StoreWithFixers>(std::vector<RuntimeFixerPtr>{
      std::make_shared<ChosenFixer>("a", notes, [&calls](const AccountPtr& account) -> FixVerdict {
        if (++calls <= 2) return FixVerdict::nothingToDo;  // while the accounts are loaded
        if (account->identifier() == "1") throw std::bad_alloc();
        return FixVerdict::fixed;
      })});
  store->load({accountInfo("1"), accountInfo("2")});
  notes.clear();
  device.systemLog.clear();
  store->saveAllAccounts();
  EXPECT_EQ(device.systemLog.lines(),
            (Lines{"Failed to save accounts to filesystem. Maybe the information "
                   "did not conform to a plist."}));
  EXPECT_EQ(notes, (Lines{"a: saving accounts 2", "a: saving accounts 1", "a: saved"}));
  EXPECT_EQ(device.countOfFileCalls("createPrivateFile"), 0U);
}

}  // namespace
}  // namespace accountsettings
