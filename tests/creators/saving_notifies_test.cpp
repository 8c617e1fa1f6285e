#include "tests/QuillnetAccountTypeRemoval/ChosenFixers.h"
#include "tests/creators/CreatorsDevice.h"

namespace accountsettings {
namespace {

Dictionary enabledInfo(std::string_view identifier, const Array& dataclasses,
                       const Dictionary& more = {}) {
  return with(accountInfo(identifier, "CalDAV", more), "Enabled Dataclasses", dataclasses);
}

class SavingNotifies : public testing::Test {
 protected:
  void notifiersAre(const Array& notifiers) { device.setCreators({{"CalDAV", notifiers}}); }
  static void speak() { ASSAccountsManager::_setShouldSkipNotifications(false); }
  CreatorsDevice device;
};

void rename(const ASSAccountsManager& store, std::string_view identifier, const std::string& name) {
  store.accountWithIdentifier(identifier)->setDisplayName(name);
}

TEST_F(SavingNotifies, NobodyUnlessToldToAndLeavesTheSnapshot) {
  // There is no catalogue of creators, and none is needed.
  device.writeAccounts({enabledInfo("1", {kContacts})});
  const auto store = TellingStore::ofFile();
  rename(*store, "1", "new");
  store->saveAllAccounts();
  EXPECT_EQ(device.savedAccounts(), Array{enabledInfo("1", {kContacts}, {{"DisplayName", "new"}})});
  EXPECT_EQ(store->originalAccountsByID().at("1"), enabledInfo("1", {kContacts}));
  EXPECT_FALSE(notifiersAreLoaded());
  EXPECT_EQ(
      device.countOfFileCalls("readPropertyListFile(" + device.resourcePath("AccountCreators")),
      0U);
}

TEST_F(SavingNotifies, OfWhatEarlierSavesSkipped) {
  notifiersAre({notifier("ChangesNotifier", {kContacts})});
  device.writeAccounts({enabledInfo("1", {kContacts})});
  const auto store = TellingStore::ofFile();
  rename(*store, "1", "new");
  store->saveAllAccounts();
  EXPECT_EQ(diaryLines(), Lines{});
  speak();
  store->saveAllAccounts();
  EXPECT_EQ(diaryLines(), Lines{told("ChangesNotifier", {change(1, "1", "CalDAV", {kContacts})})});
  // Now the snapshot is what was told.
  EXPECT_EQ(store->originalAccountsByID().at("1"),
            enabledInfo("1", {kContacts}, {{"DisplayName", "new"}}));
  store->saveAllAccounts();
  EXPECT_EQ(diaryLines().size(), 1U);
}

TEST_F(SavingNotifies, EachNotifierOnceOfDeletedThenAddedThenModifiedAccounts) {
  notifiersAre({notifier("ChangesNotifier", {kContacts, kMail}), notifier("OtherNotifier", {kMail}),
                notifier("Missing", {kNotes})});
  device.writeAccounts({enabledInfo("b", {kContacts}), enabledInfo("c", {kMail, kContacts}),
                        enabledInfo("d", {kContacts})});
  const auto store = TellingStore::ofFile();
  rename(*store, "b", "new");
  store->deleteAccountWithIdentifier("c");
  store->insertAccount(ASSBasicAccount::initWithProperties(enabledInfo("a", {kContacts})));
  speak();
  store->saveAllAccounts();
  EXPECT_EQ(diaryLines(),
            (Lines{told("ChangesNotifier",
                        {change(2, "c", "CalDAV", {kMail, kContacts}),
                         change(0, "a", "CalDAV", Array{}), change(1, "b", "CalDAV", {kContacts})}),
                   told("OtherNotifier", {change(2, "c", "CalDAV", {kMail, kContacts})})}));
}

TEST_F(SavingNotifies, NobodyWhenNothingChangedOrOnlyAChildDid) {
  notifiersAre({notifier("Missing", {kContacts})});
  device.writeAccounts(
      {enabledInfo("1", {kContacts}, {{"ChildAccounts", Array{accountInfo("c")}}})});
  const auto store = TellingStore::ofFile();
  speak();
  store->saveAllAccounts();
  EXPECT_FALSE(notifiersAreLoaded());
  const AccountPtr child = ASSBasicAccount::initWithProperties(enabledInfo("d", {kContacts}));
  store->addChildToAccount(child, store->accountWithIdentifier("1"));
  store->saveAllAccounts();
  EXPECT_FALSE(notifiersAreLoaded());
  EXPECT_EQ(diaryLines(), Lines{});
}

TEST_F(SavingNotifies, AfterTheFileIsWrittenAndKeepsTheSnapshotWhenANotifierIsMissing) {
  notifiersAre({notifier("Missing", {kContacts})});
  device.writeAccounts({enabledInfo("1", {kContacts})});
  const auto store = TellingStore::ofFile();
  rename(*store, "1", "new");
  speak();
  expectStoreFailure("Could not find a class for class name Missing", 992,
                     [&] { store->saveAllAccounts(); });
  EXPECT_EQ(device.savedAccounts(), Array{enabledInfo("1", {kContacts}, {{"DisplayName", "new"}})});
  EXPECT_EQ(store->originalAccountsByID().at("1"), enabledInfo("1", {kContacts}));
}

TEST_F(SavingNotifies, AfterTheRecordsCountAsSaved) {
  notifiersAre({notifier("Missing", {kContacts})});
  device.writeAccounts({enabledInfo("1", {kContacts})});
  const auto store = TellingStore::ofFile();
  rename(*store, "1", "new");
  speak();
  expectStoreFailure("Could not find a class for class name Missing", 992,
                     [&] { store->saveAllAccounts(); });
  EXPECT_EQ(store->accountWithIdentifier("1")->originalProperties(),
            enabledInfo("1", {kContacts}, {{"DisplayName", "new"}}));
}

TEST_F(SavingNotifies, AfterTheFixersWereTold) {
  notifiersAre({notifier("ChangesNotifier", {kContacts})});
  device.writeAccounts({enabledInfo("1", {kContacts})});
  FixVerdict verdict = FixVerdict::nothingToDo;
  StoreWithFixers store({std::make_shared<ChosenFixer>(
      "fixer", diaryLines(), [&](const AccountPtr&) { return verdict; })});
  store.loadFile();
  rename(store, "1", "new");
  verdict = FixVerdict::fixed;
  speak();
  diaryLines().clear();
  store.saveAllAccounts();
  EXPECT_EQ(diaryLines(),
            (Lines{"fixer: saving accounts 1", "fixer: saved",
                   told("ChangesNotifier", {change(1, "1", "CalDAV", {kContacts})})}));
}

TEST_F(SavingNotifies, ANotifierThatTakesNoChangesIsABrokenInstallation) {
  notifiersAre({notifier("DeafClass", {kContacts})});
  device.writeAccounts({enabledInfo("1", {kContacts})});
  const auto store = TellingStore::ofFile();
  rename(*store, "1", "new");
  speak();
  try {
    store->saveAllAccounts();
    ADD_FAILURE() << "nothing was raised";
  } catch (const platform::InternalConsistencyFailure& failure) {
    EXPECT_EQ(failure.what(), std::string("DeafClass does not take account changes"));
    EXPECT_EQ(failure.sourceFile(), "ASSAccountsManager");
    EXPECT_NE(failure.line(), 992);  // which stands for a missing class
  }
  EXPECT_EQ(store->originalAccountsByID().at("1"), enabledInfo("1", {kContacts}));
}

TEST_F(SavingNotifies, NeedsAListOnlyForTypesOfAffectedAccounts) {
  device.setCreators({{"Mail", Array{}}});
  device.writeAccounts({accountInfo("1")});
  const auto store = TellingStore::ofFile();
  rename(*store, "1", "new");
  speak();
  store->saveAllAccounts();
  store->insertAccount(ASSBasicAccount::initWithProperties(enabledInfo("2", {kContacts})));
  expectStoreFailure(
      "Malformed AccountCreators information. Could not find the information for the type CalDAV",
      820, [&] { store->saveAllAccounts(); });
}

TEST_F(SavingNotifies, NobodyWhenTheFileCouldNotBeWritten) {
  notifiersAre({notifier("ChangesNotifier", {kContacts})});
  device.writeAccounts({enabledInfo("1", {kContacts})});
  const auto store = TellingStore::ofFile();
  rename(*store, "1", "new");
  speak();
  device.fileServices.failEvery("renameFileToFile");
  store->saveAllAccounts();
  EXPECT_EQ(diaryLines(), Lines{});
  EXPECT_EQ(store->originalAccountsByID().at("1"), enabledInfo("1", {kContacts}));
}

TEST_F(SavingNotifies, OfAReplacedAccountAsDeletedAlthoughItIsWritten) {
  notifiersAre({notifier("ChangesNotifier", {kContacts})});
  device.writeAccounts({enabledInfo("1", {kContacts})});
  const auto store = TellingStore::ofFile();
  const Dictionary replacement = enabledInfo("1", {kContacts}, {{"DisplayName", "new"}});
  store->replaceAccountWithAccount(store->accountWithIdentifier("1"),
                                   ASSBasicAccount::initWithProperties(replacement));
  speak();
  store->saveAllAccounts();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), Lines{"1"});
  EXPECT_EQ(diaryLines(), Lines{told("ChangesNotifier", {change(2, "1", "CalDAV", {kContacts})})});
}

TEST_F(SavingNotifies, OfAnAccountThatAFixerDroppedAsDeletedAlthoughItIsWritten) {
  notifiersAre({notifier("ChangesNotifier", {kContacts})});
  device.writeAccounts({enabledInfo("1", {kContacts})});
  Lines notes;
  FixVerdict verdict = FixVerdict::nothingToDo;
  StoreWithFixers store(
      {std::make_shared<ChosenFixer>("fixer", notes, [&](const AccountPtr&) { return verdict; })});
  store.loadFile();
  verdict = FixVerdict::couldNotFix;
  speak();
  store.saveAllAccounts();
  EXPECT_EQ(identifiersOf(device.savedAccounts()), Lines{"1"});
  EXPECT_EQ(diaryLines(), Lines{told("ChangesNotifier", {change(2, "1", "CalDAV", {kContacts})})});
}

}  // namespace
}  // namespace accountsettings
