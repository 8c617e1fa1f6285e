#include "migrator/MergeAndRemoveQuillnetAccounts.h"

#include "QuillnetAccountTypeRemoval/PropertyNumbers.h"
#include "localdata/AccountSettingsUISyncDataController.h"
#include "platform/Services.h"

namespace migrator {

using namespace accountsettings;
using platform::logToSystem;

namespace {

bool isToBeRetired(const ASSBasicAccount& account) {
  const std::optional<std::string> type = account.type();
  if (type != kQuillnetAccountType && type != kVantorAccountType) return false;
  const std::string statusKey = platform::services().accountFramework.QuillnetStatusKey();
  return integerValue(account.accountPropertyForKey(statusKey)) == 1;
}

}  // namespace

std::string MergeAndRemoveQuillnetAccounts::dataClassName() { return "Quillnet Account Removal"; }

bool MergeAndRemoveQuillnetAccounts::performMigration() {
  manager_ = ASSAccountsManager::init();
  const AccountArray accounts = *manager_->allBasicAccounts();  // a copy: accounts go meanwhile
  for (const AccountPtr& account : accounts) {
    logToSystem("Checking account %@ of type %@", account, account->type());
    if (!isToBeRetired(*account)) continue;
    if (_mergeAccountDataToLocalStore(account))
      _removeAccount(account);
    else
      logToSystem("Quillnet account merge failed");
  }
  return true;
}

bool MergeAndRemoveQuillnetAccounts::_mergeAccountDataToLocalStore(const AccountPtr& account) {
  localdata::AccountSettingsUISyncDataController controller;
  controller.setSyncAccount(account);
  for (const std::string& dataclass : account->enabledDataclasses().value_or(StringList())) {
    logToSystem("Merging %@ to the localstore", dataclass);
    if (ASSBasicAccount::multipleStoresSupportedByDataclass(dataclass)) {
      logToSystem("mergeSyncDataForDataclass");
      controller.mergeSyncDataForDataclass(dataclass);
      logToSystem("removeDataStoreForDataclass");
      controller.removeDataStoreForDataclass(dataclass);
    } else {
      logToSystem("createLocalDataSourceForDataclass");
      controller.createLocalDataSourceForDataclass(dataclass);
    }
    controller.clearAnchorsForLocalDataclass(dataclass);
    controller.showLocalStoreIfAppropriateForDataclass(dataclass);
  }
  // The device-local account's changed list of dataclasses is not saved: what lasts of it is what
  // the platform's stores recorded.
  return true;
}

bool MergeAndRemoveQuillnetAccounts::_removeAccount(const AccountPtr& account) {
  manager_->deleteAccount(account);
  manager_->saveAllAccounts();
  return true;
}

}  // namespace migrator
