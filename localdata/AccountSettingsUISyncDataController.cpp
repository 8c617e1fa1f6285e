#include "localdata/AccountSettingsUISyncDataController.h"

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "localdata/DataclassFunctions.h"
#include "platform/BookmarksStore.h"
#include "platform/Services.h"

namespace localdata {

using namespace accountsettings;
using platform::DataSourceOptions;
using platform::DataSourcePtr;
using platform::logToSystem;
using platform::Status;

namespace {

// Some of these texts name the other source than the one at hand; they are what operators search
// for.
constexpr const char* kCouldNotCreate =
    "Could not create the datasource for the dataclass %@ of the Device Local Account. Error %@";
constexpr const char* kCouldNotDelete =
    "Could not delete the datasource for the dataclass %@ of the Device Local Account. Error %@";
constexpr const char* kCouldNotCommitChanges =
    "Could not commit the changes to the datasource for the dataclass %@ of the Device Local "
    "Account. Error %@";
constexpr const char* kCouldNotCloseService = "Could not delete ota data source (%@). Error: %@";
constexpr const char* kCouldNotCloseLocal = "Could not delete tethered sync data source. Error: %@";

platform::SyncDataSource& dataSources() { return platform::services().syncDataSource; }

bool isOfCalendarStore(std::string_view dataclass) {
  return dataclass == kAccountDataclassCalendars || dataclass == kAccountDataclassReminders;
}

void closeLocalSource(const DataSourcePtr& local) {
  const Status closed = dataSources().deleteDataSource(local);
  if (!closed.isSuccess()) logToSystem(kCouldNotCloseLocal, closed.error);
}

// How the sync agent names the service account's stores; empty when it knows no account.
std::optional<std::string> syncAgentStoreIdentifier() {
  const std::optional<propertylist::Value> name =
      platform::services().preferences.readApplicationPreference("com.vantor.OTASyncAgent",
                                                                 "AccountName");
  const propertylist::Text* text = name ? name->asString() : nullptr;
  if (text == nullptr) return std::nullopt;
  return platform::formatLogLine("Quillnet:%@", {*text});
}

}  // namespace

const DeviceLocalAccountPtr& AccountSettingsUISyncDataController::deviceLocalAccount() {
  if (!deviceLocalAccount_)
    deviceLocalAccount_ = ASSAccountsManager::init()->fullDeviceLocalAccount();
  return deviceLocalAccount_;
}

std::optional<std::string> AccountSettingsUISyncDataController::_syncableChildAccountIDOfClass(
    [[maybe_unused]] std::string_view className) const {
  return std::nullopt;
}

DataSourcePtr AccountSettingsUISyncDataController::createDeviceLocalSyncDataSourceForDataclass(
    std::string_view dataclass) {
  return ASSDeviceLocalAccount::createSyncDataSourceForDataclassOptions(dataclass, std::nullopt);
}

std::optional<std::string> AccountSettingsUISyncDataController::_calendarChildIdentifier() const {
  const std::optional<std::string> wanted = syncAccount_->identifier();
  for (const AccountPtr& account : ASSAccountsManager::init()->allBasicSyncableAccounts()) {
    const std::optional<std::string> parent = account->parentAccountIdentifier();
    if (parent && parent == wanted && account->accountClass() == "MobileCalDAVAccount")
      return account->identifier();
  }
  return std::nullopt;
}

DataSourcePtr AccountSettingsUISyncDataController::_createQuillnetDataSourceForDataclass(
    std::string_view dataclass) {
  std::optional<std::string> identifier = syncAgentStoreIdentifier();
  DataSourceOptions options;  // none for reminders: the source then holds the events as well
  if (dataclass == kAccountDataclassCalendars) {
    options = {{platform::EventsOnlySourceOption, true}};
    if (const std::optional<std::string> child = _calendarChildIdentifier()) identifier = child;
  } else if (dataclass == kAccountDataclassBookmarks) {
    options = {{platform::BookmarksStore::ClearHiddenBookmarksOption, true}};
  }
  if (!identifier) return nullptr;
  auto created = dataSources().createDataSource(
      AccountSettingsOrvetteSyncDataclassNameForDataclass(dataclass), identifier, options);
  if (!created.status.isSuccess() || !created.source)
    logToSystem(kCouldNotCreate, dataclass, created.status.error);
  if (dataclass == kAccountDataclassCalendars) {
    // The calendar source reads its store at the first count; without it the store may look empty.
    dataSources().countRecords(created.source).status.ignore("only the reading is wanted");
  }
  return created.source;
}

void AccountSettingsUISyncDataController::_closeServiceSource(const DataSourcePtr& source) {
  const Status closed = dataSources().deleteDataSource(source);
  if (!closed.isSuccess())
    logToSystem(kCouldNotCloseService,
                syncAccount_ ? std::optional(syncAccount_->className()) : std::nullopt,
                closed.error);
}

void AccountSettingsUISyncDataController::_commitAndClose(const DataSourcePtr& local,
                                                          const DataSourcePtr& service) {
  if (local) {
    const Status committed = dataSources().commit(local);
    if (!committed.isSuccess())
      logToSystem("Could not commit tethered sync data source. Error: %@", committed.error);
    closeLocalSource(local);
  }
  if (service) {
    const Status committed = dataSources().commit(service);
    if (!committed.isSuccess())
      logToSystem("Could not commit ota sync data source. Error: %@", committed.error);
    _closeServiceSource(service);
  }
}

void AccountSettingsUISyncDataController::mergeSyncDataForDataclass(std::string_view dataclass) {
  const DataSourcePtr local = createDeviceLocalSyncDataSourceForDataclass(dataclass);
  const DataSourcePtr service = _createQuillnetDataSourceForDataclass(dataclass);
  const Status merged = dataSources().migrateRecords(service, local);
  if (!merged.isSuccess())
    logToSystem("Could not merge %@ from %@ into the local store. Error: %@",
                syncAccount_->displayName(), dataclass, merged.error);
  _commitAndClose(local, service);
}

void AccountSettingsUISyncDataController::mergeLocalDataForDataclass(std::string_view dataclass) {
  const DataSourcePtr local = createDeviceLocalSyncDataSourceForDataclass(dataclass);
  const DataSourcePtr service = _createQuillnetDataSourceForDataclass(dataclass);
  const Status merged = dataSources().migrateRecords(local, service);
  if (!merged.isSuccess()) {
    logToSystem("Could not merge local %@ into %@. Error: %@", dataclass,
                syncAccount_->displayName(), merged.error);
  } else if (isOfCalendarStore(dataclass)) {
    syncAccount_->setAccountPropertyForKey(propertylist::Value(true),
                                           kAccountCalendarsWereMigrated);
  }
  _commitAndClose(local, service);
}

void AccountSettingsUISyncDataController::removeDataStoreForDataclass(std::string_view dataclass) {
  const DataSourcePtr service = _createQuillnetDataSourceForDataclass(dataclass);
  if (!service) return;
  Status status;
  if (!isOfCalendarStore(dataclass)) {
    status = dataSources().removeStore(service, false);
  } else {
    status = dataSources().clearAllRecords(service);
    const std::string_view other = dataclass == kAccountDataclassCalendars
                                       ? kAccountDataclassReminders
                                       : kAccountDataclassCalendars;
    if (!syncAccount_->isEnabledForDataclass(other))
      dataSources().removeStore(service, false).ignore("whether the store was emptied decides");
  }
  if (!status.isSuccess()) {
    logToSystem(kCouldNotDelete, dataclass, status.error);
  } else {
    const Status committed = dataSources().commit(service);
    if (!committed.isSuccess()) logToSystem(kCouldNotCommitChanges, dataclass, committed.error);
  }
  _closeServiceSource(service);
}

void AccountSettingsUISyncDataController::removeLocalDataStoreForDataclass(
    std::string_view dataclass) {
  if (!isOfCalendarStore(dataclass)) {
    deviceLocalAccount()->setEnabledForDataclass(false, dataclass);
    shouldSaveDeviceLocalAccount_ = true;
    deviceLocalAccount()->deleteLocalDataSourceForDataclass(dataclass);
    return;
  }
  // A source that did not come back is passed on all the same; the platform answers with failures.
  const DataSourcePtr local = createDeviceLocalSyncDataSourceForDataclass(dataclass);
  dataSources().clearAllRecords(local).ignore("the commit tells");
  const Status committed = dataSources().commit(local);
  if (!committed.isSuccess()) logToSystem(kCouldNotCommitChanges, dataclass, committed.error);
  _closeServiceSource(local);
  hideLocalStoreForDataclass(dataclass);
}

void AccountSettingsUISyncDataController::createLocalDataSourceForDataclass(
    std::string_view dataclass) {
  deviceLocalAccount()->setEnabledForDataclass(true, dataclass);
  shouldSaveDeviceLocalAccount_ = true;
  const DataSourcePtr local = createDeviceLocalSyncDataSourceForDataclass(dataclass);
  if (!local) return;
  const Status committed = dataSources().commit(local);
  if (!committed.isSuccess())
    logToSystem("Could not commit the newly created tethered sync source. Error: %@",
                committed.error);
  closeLocalSource(local);
}

void AccountSettingsUISyncDataController::clearAnchorsForLocalDataclass(
    std::string_view dataclass) {
  const DataSourcePtr local = createDeviceLocalSyncDataSourceForDataclass(dataclass);
  if (!local) return;
  const Status cleared = dataSources().clearSyncAnchors(local);
  if (!cleared.isSuccess())
    logToSystem("Could not clear the anchors for %@ of account %@. Error: %@", dataclass,
                syncAccount_ ? syncAccount_->displayName() : std::nullopt, cleared.error);
  closeLocalSource(local);
}

void AccountSettingsUISyncDataController::hideLocalStoreForDataclass(std::string_view dataclass) {
  deviceLocalAccount()->hideLocalStoreForDataclass(dataclass);
}

void AccountSettingsUISyncDataController::showLocalStoreIfAppropriateForDataclass(
    std::string_view dataclass) {
  deviceLocalAccount()->showLocalStoreIfAppropriateForDataclass(dataclass);
}

void AccountSettingsUISyncDataController::saveDeviceLocalAccount() {
  const AccountsManagerPtr store = ASSAccountsManager::init();
  store->replaceAccountsWithTypesWithAccounts({std::string(kOnMyDeviceAccountType)},
                                              {deviceLocalAccount()});
  store->saveAllAccounts();
}

}  // namespace localdata
