// The operations of the device-local account that reach the platform's stores (AccountSettingsUI).

#include <algorithm>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "QuillnetAccountTypeRemoval/ASSDeviceLocalAccount.h"
#include "localdata/DataclassFunctions.h"
#include "localdata/LocalStores.h"
#include "platform/Services.h"

namespace accountsettings {

using platform::DataSourceOptions;
using platform::Status;

namespace {

constexpr const char* kCouldNotCreate =
    "Could not create the datasource for the dataclass %@ of the Device Local Account. Error %@";

platform::SyncDataSource& dataSources() { return platform::services().syncDataSource; }

}  // namespace

std::string ASSDeviceLocalAccount::displayedShortAccountTypeString() { return classTypeString(); }

std::string ASSDeviceLocalAccount::displayedAccountTypeString() { return classTypeString(); }

platform::DataSourcePtr ASSDeviceLocalAccount::createSyncDataSourceForDataclassOptions(
    std::string_view dataclass, const DataSourceOptions& options) {
  DataSourceOptions all;
  if (dataclass == kAccountDataclassCalendars)
    all = {{platform::EventsOnlySourceOption, true}};
  else if (dataclass == kAccountDataclassReminders)
    all = {{platform::RemindersOnlySourceOption, true}};
  if (!all) {
    all = options;
  } else if (options) {
    for (const auto& option : *options) all->set(option.key(), option.value());
  }
  auto created = dataSources().createDataSource(
      localdata::AccountSettingsOrvetteSyncDataclassNameForDataclass(dataclass), std::nullopt, all);
  if (!created.status.isSuccess() || !created.source)
    platform::logToSystem(kCouldNotCreate, dataclass, created.status.error);
  return created.source;
}

void ASSDeviceLocalAccount::setEnabledForDataclass(bool enabled, std::string_view dataclass) {
  if (_setTetheredDataSourceEnabledForDataclass(enabled, dataclass))
    ASSBasicAccount::setEnabledForDataclass(enabled, dataclass);
}

void ASSDeviceLocalAccount::setTetheredEnabledForDataclass(bool enabled,
                                                           std::string_view dataclass) {
  _setTetheredDataSourceEnabledForDataclass(enabled, dataclass);
}

bool ASSDeviceLocalAccount::_setTetheredDataSourceEnabledForDataclass(bool enabled,
                                                                      std::string_view dataclass) {
  const auto type = localdata::AccountSettingsOrvetteSyncTypeForDataclass(dataclass);
  if (!type) return false;
  const Status status = dataSources().setTetheredSyncingDisabled(*type, !enabled);
  if (status.isSuccess()) return true;
  platform::logToSystem(
      "Could not %@ the datasource for the dataclass %@ of the Device Local Account. Error %@",
      enabled ? "ENABLE" : "DISABLE", dataclass, status.error);
  return false;
}

void ASSDeviceLocalAccount::deleteLocalDataSourceForDataclass(std::string_view dataclass) {
  _deleteDataSourceForDataclass(dataclass);
}

bool ASSDeviceLocalAccount::_deleteDataSourceForDataclass(std::string_view dataclass) {
  const auto created = dataSources().createDataSource(
      localdata::AccountSettingsOrvetteSyncDataclassNameForDataclass(dataclass), std::nullopt,
      std::nullopt);
  if (created.status.isSuccess() && created.source) {
    const Status removed = dataSources().removeStore(created.source, false);
    if (!removed.isSuccess())
      platform::logToSystem(
          "Could not delete the datasource for the dataclass %@ of the Device Local Account. "
          "Error %@",
          dataclass, removed.error);
  } else {
    platform::logToSystem(kCouldNotCreate, dataclass, created.status.error);
  }
  if (!created.source) return created.status.isSuccess();
  const Status closed = dataSources().deleteDataSource(created.source);
  if (!closed.isSuccess())
    platform::logToSystem("Deleting the DataSource failed with error: %@", closed.error);
  return closed.isSuccess();
}

bool ASSDeviceLocalAccount::otherAccountEnabledForDataclass(std::string_view dataclass) const {
  const auto type = localdata::AccountSettingsOrvetteSyncTypeForDataclass(dataclass);
  // A dataclass that is not synced has no sources to ask for, which counts as a failure to ask.
  const auto sources = type ? dataSources().externalSourcesEnabledForSyncType(*type)
                            : platform::SyncDataSource::ExternalSources{Status{-1, {}}, {}};
  if (!sources.status.isSuccess()) {
    platform::logToSystem("[%s]Error while retreiving external sources for dataclass %@ [%@]",
                          "-[ASSDeviceLocalAccount(AccountSettingsUI) "
                          "otherAccountEnabledForDataclass:]",
                          dataclass, sources.status.error);
    return true;
  }
  return sources.names &&
         std::any_of(sources.names->begin(), sources.names->end(),
                     [](const std::string& name) { return name != "DenyTethered"; });
}

void ASSDeviceLocalAccount::showLocalStoreIfAppropriateForDataclass(std::string_view dataclass) {
  if (dataclass == kAccountDataclassContacts)
    localdata::enableAddressBookLocalStore(false);
  else if (dataclass == kAccountDataclassCalendars)
    localdata::enableCalendarLocalStore(false);
  else if (dataclass == kAccountDataclassReminders)
    localdata::enableRemindersLocalStore(false);
}

void ASSDeviceLocalAccount::hideLocalStoreForDataclass(std::string_view dataclass) {
  if (dataclass == kAccountDataclassContacts)
    localdata::setAddressBookLocalSourceEnabled(false, true);
  else if (dataclass == kAccountDataclassCalendars || dataclass == kAccountDataclassReminders)
    localdata::setCalendarLocalStoreEnabled(dataclass, false, true);
}

void ASSDeviceLocalAccount::_saveChangesToOnMyDeviceAccount() {
  const AccountsManagerPtr store = ASSAccountsManager::init();
  store->replaceAccountsWithTypesWithAccounts({std::string(kOnMyDeviceAccountType)},
                                              {shared_from_this()});
  store->saveAllAccounts();
}

}  // namespace accountsettings
