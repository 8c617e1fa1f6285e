// The controller's own state and its work on the device-local account.

#include "localdata/AccountSettingsUISyncDataController.h"
#include "tests/localdata/LocalDataTest.h"

namespace localdata {
namespace {

using Names = std::vector<std::string>;

constexpr const char* kContacts = "com.vantor.Dataclass.Contacts";

class OpenedUpController : public AccountSettingsUISyncDataController {
 public:
  using AccountSettingsUISyncDataController::_syncableChildAccountIDOfClass;
  using AccountSettingsUISyncDataController::_syncActionsAccount;
};

class Controller : public LocalDataTest {
 protected:
  Names localEnabled() {
    return controller.deviceLocalAccount()->enabledDataclasses().value_or(Names());
  }
  AccountPtr account = record(accountInfo("Quillnet", "q", {}));
  OpenedUpController controller;
};

using TakingOver = Controller;
using ClearingAnchors = Controller;

TEST_F(Controller, StartsWithoutAnythingAndLoadsNothing) {
  EXPECT_EQ(controller.syncAccount(), nullptr);
  EXPECT_EQ(controller._syncActionsAccount(), nullptr);
  EXPECT_FALSE(controller.shouldSaveDeviceLocalAccount());
  controller.setSyncAccount(account);
  EXPECT_EQ(controller.syncAccount(), account);
  EXPECT_EQ(controller._syncActionsAccount(), account);
  EXPECT_EQ(settingsReads(), 0U);
  EXPECT_EQ(device.journal, Journal{});
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(Controller, ReleasesWhatItHolds) {
  const std::weak_ptr<accountsettings::ASSDeviceLocalAccount> local = [&] {
    AccountSettingsUISyncDataController shortLived;
    shortLived.setSyncAccount(account);
    return shortLived.deviceLocalAccount();
  }();
  EXPECT_TRUE(local.expired());
  EXPECT_EQ(account.use_count(), 1);
}

TEST_F(Controller, LoadsTheDeviceLocalAccountOnceAndKeepsIt) {
  writeAccounts({deviceLocalInfo({"Contacts"})});
  const auto first = controller.deviceLocalAccount();
  writeAccounts({deviceLocalInfo({"Notes"})});
  EXPECT_EQ(controller.deviceLocalAccount(), first);
  EXPECT_EQ(localEnabled(), Names{kContacts});
  EXPECT_EQ(settingsReads(), 1U);
  AccountSettingsUISyncDataController another;
  EXPECT_NE(another.deviceLocalAccount(), first);
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(Controller, MakesAMissingDeviceLocalAccountOnce) {
  controller.deviceLocalAccount();
  controller.deviceLocalAccount();
  EXPECT_EQ(device.logLines(), Lines{"DeviceLocalAccount missing. Creating..."});
}

TEST_F(Controller, KnowsNoSyncableChildOfAnyClass) {
  const Dictionary child{
      {"Type", "CalDAV"}, {"Class", "MobileCalDAVAccount"}, {"Identifier", "cal"}};
  writeAccounts({with(accountInfo("Quillnet", "q", {}), {{"ChildAccounts", Array{Value(child)}}})});
  controller.setSyncAccount(account);
  EXPECT_EQ(controller._syncableChildAccountIDOfClass("MobileCalDAVAccount"), std::nullopt);
  EXPECT_EQ(controller._syncableChildAccountIDOfClass(""), std::nullopt);
}

TEST_F(Controller, OpensTheLocalSourceWithoutTheDeviceLocalAccount) {
  EXPECT_NE(controller.createDeviceLocalSyncDataSourceForDataclass(kContacts), nullptr);
  EXPECT_EQ(device.journal, (Journal{"dataclassNameForSyncType(Contacts)",
                                     "createDataSource(Contacts, none, none)"}));
  EXPECT_EQ(settingsReads(), 0U);
}

TEST_F(TakingOver, TurnsTheDataclassOnAndCommitsItsSource) {
  writeAccounts({deviceLocalInfo({})});
  controller.createLocalDataSourceForDataclass("com.vantor.Dataclass.Bookmarks");
  EXPECT_EQ(
      device.journal,
      (Journal{"setTetheredSyncingDisabled(Bookmarks, false)",
               "dataclassNameForSyncType(Bookmarks)", "createDataSource(Bookmarks, none, none)",
               "commit(local Bookmarks)", "deleteDataSource(local Bookmarks)"}));
  EXPECT_TRUE(device.syncDataSource.storeExists(std::nullopt, "Bookmarks"));
  EXPECT_EQ(localEnabled(), Names{"com.vantor.Dataclass.Bookmarks"});
  EXPECT_TRUE(controller.shouldSaveDeviceLocalAccount());
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(TakingOver, GoesOnWhenTheDataclassCouldNotBeTurnedOn) {
  writeAccounts({deviceLocalInfo({})});
  device.syncDataSource.failNext("setTethered", Status::failure(1, "not now"));
  controller.createLocalDataSourceForDataclass(kContacts);
  EXPECT_EQ(localEnabled(), Names{});
  EXPECT_TRUE(controller.shouldSaveDeviceLocalAccount());
  EXPECT_TRUE(device.syncDataSource.storeExists(std::nullopt, "Contacts"));
  EXPECT_EQ(
      device.logLines(),
      (Lines{"Could not ENABLE the datasource for the dataclass com.vantor.Dataclass.Contacts "
             "of the Device Local Account. Error not now"}));
}

TEST_F(TakingOver, ClosesAlsoAfterAFailedCommit) {
  writeAccounts({deviceLocalInfo({})});
  device.syncDataSource.failNext("commit", Status::failure(1, "disk full"));
  device.syncDataSource.failNext("deleteDataSource", Status::failure(1, "busy"));
  controller.createLocalDataSourceForDataclass(kContacts);
  EXPECT_EQ(device.journal.back(), "deleteDataSource(local Contacts)");
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not commit the newly created tethered sync source. Error: disk full",
                   "Could not delete tethered sync data source. Error: busy"}));
}

TEST_F(TakingOver, CommitsAndClosesNothingWithoutASource) {
  writeAccounts({deviceLocalInfo({})});
  device.syncDataSource.failNext("createDataSource", Status::failure(1, "refused"));
  controller.createLocalDataSourceForDataclass(kContacts);
  EXPECT_EQ(device.journal.back(), "createDataSource(Contacts, none, none)");
  EXPECT_TRUE(controller.shouldSaveDeviceLocalAccount());
}

TEST_F(TakingOver, AddsUpOnOneDeviceLocalAccount) {
  writeAccounts({deviceLocalInfo({})});
  controller.createLocalDataSourceForDataclass(kContacts);
  controller.createLocalDataSourceForDataclass("com.vantor.Dataclass.Notes");
  EXPECT_EQ(localEnabled(), (Names{kContacts, "com.vantor.Dataclass.Notes"}));
  EXPECT_EQ(settingsReads(), 1U);
}

TEST_F(ClearingAnchors, ClearsAndClosesWithoutACommit) {
  device.syncDataSource.stores[{std::nullopt, "Contacts"}].hasAnchors = true;
  controller.setSyncAccount(account);
  controller.clearAnchorsForLocalDataclass(kContacts);
  EXPECT_EQ(device.journal,
            (Journal{"dataclassNameForSyncType(Contacts)", "createDataSource(Contacts, none, none)",
                     "clearSyncAnchors(local Contacts)", "deleteDataSource(local Contacts)"}));
  EXPECT_FALSE((device.syncDataSource.stores[{std::nullopt, "Contacts"}].hasAnchors));
  EXPECT_EQ(device.logLines(), Lines{});
  EXPECT_EQ(settingsReads(), 0U);
}

TEST_F(ClearingAnchors, DoesNothingWithoutASource) {
  controller.setSyncAccount(account);
  device.syncDataSource.answerNext("createDataSource", {Status::success(), false});
  controller.clearAnchorsForLocalDataclass(kContacts);
  EXPECT_EQ(device.journal.back(), "createDataSource(Contacts, none, none)");
}

TEST_F(ClearingAnchors, TellsFailuresWithTheDataclassFirstAndClosesAllTheSame) {
  controller.setSyncAccount(account);
  device.syncDataSource.failNext("clearSyncAnchors", Status::failure(1, "locked"));
  device.syncDataSource.failNext("deleteDataSource", Status::failure(1, "busy"));
  controller.clearAnchorsForLocalDataclass(kContacts);
  EXPECT_EQ(device.journal.back(), "deleteDataSource(local Contacts)");
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not clear the anchors for com.vantor.Dataclass.Contacts "
                   "of account Name of q. Error: locked",
                   "Could not delete tethered sync data source. Error: busy"}));
}

TEST_F(ClearingAnchors, NamesNoAccountWithoutASyncAccount) {
  device.syncDataSource.failNext("clearSyncAnchors", Status::failure(1, "locked"));
  controller.clearAnchorsForLocalDataclass(kContacts);
  EXPECT_EQ(device.logLines(),
            (Lines{"Could not clear the anchors for com.vantor.Dataclass.Contacts "
                   "of account (null). Error: locked"}));
}

TEST_F(Controller, ShowsAndHidesThroughTheDeviceLocalAccount) {
  writeAccounts({deviceLocalInfo({})});
  controller.hideLocalStoreForDataclass(kContacts);
  EXPECT_FALSE(device.contactsStore.isSourceEnabled("local"));
  controller.showLocalStoreIfAppropriateForDataclass(kContacts);
  EXPECT_TRUE(device.contactsStore.isSourceEnabled("local"));
  writeAccounts({accountInfo("Quillnet", "q", {"Contacts"})});
  controller.hideLocalStoreForDataclass(kContacts);
  controller.showLocalStoreIfAppropriateForDataclass(kContacts);
  EXPECT_FALSE(device.contactsStore.isSourceEnabled("local"));
}

TEST_F(Controller, SavesTheDeviceLocalAccountWhetherOrNotItShould) {
  writeAccounts({accountInfo("Mail", "m", {"Mail"}), deviceLocalInfo({"Notes"})});
  controller.deviceLocalAccount()->ASSBasicAccount::setEnabledForDataclass(true, kContacts);
  EXPECT_FALSE(controller.shouldSaveDeviceLocalAccount());
  controller.saveDeviceLocalAccount();
  EXPECT_EQ(savedProperty("OnMyDevice", "Enabled Dataclasses"),
            Value(dataclasses({"Contacts", "Notes"})));
  EXPECT_EQ(savedProperty("Mail", "Identifier"), Value("m"));
  EXPECT_FALSE(controller.shouldSaveDeviceLocalAccount());
  EXPECT_EQ(settingsReads(), 3U);  // the account, the fresh store, and the merge of its save
}

TEST_F(Controller, SavesADeviceLocalAccountThatTheFileLacks) {
  writeAccounts({accountInfo("Mail", "m", {"Mail"})});
  controller.createLocalDataSourceForDataclass(kContacts);
  controller.saveDeviceLocalAccount();
  EXPECT_EQ(savedProperty("OnMyDevice", "Enabled Dataclasses"), Value(dataclasses({"Contacts"})));
  EXPECT_TRUE(controller.shouldSaveDeviceLocalAccount());
}

}  // namespace
}  // namespace localdata
