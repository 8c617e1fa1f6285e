#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"
#include "QuillnetAccountTypeRemoval/ASSDeviceLocalAccount.h"
#include "platform/SyncDataSource.h"

namespace localdata {

// Moves the records of one dataclass at a time between the store of a service account and the store
// of the device-local account, and empties or removes these stores. One controller serves one
// account: set its syncAccount, use it, drop it. What touches the service's store needs one.
//
// No operation reports failure: what the platform could not do is logged, and the next step is
// taken all the same. Every data source that an operation opens is closed by it. One thread at a
// time.
class AccountSettingsUISyncDataController {
 public:
  // The account whose data is merged or removed.
  const accountsettings::AccountPtr& syncAccount() const { return syncAccount_; }
  void setSyncAccount(const accountsettings::AccountPtr& account) { syncAccount_ = account; }
  // The device-local account, from a fresh store at the first call and then kept, so that all
  // changes of one controller act on one record.
  const accountsettings::DeviceLocalAccountPtr& deviceLocalAccount();
  // Whether an operation changed what the device-local account has enabled; saveDeviceLocalAccount
  // is the caller's business. Never goes back to false.
  bool shouldSaveDeviceLocalAccount() const { return shouldSaveDeviceLocalAccount_; }

  // The device-local source of the dataclass; empty when none came back. The caller closes it.
  platform::DataSourcePtr createDeviceLocalSyncDataSourceForDataclass(std::string_view dataclass);

  // Copies the service's records into the device-local store.
  void mergeSyncDataForDataclass(std::string_view dataclass);
  // Copies the device-local records into the service's store. When calendars or reminders were
  // copied the account is marked as having its calendars migrated; it is not saved.
  void mergeLocalDataForDataclass(std::string_view dataclass);
  // Removes the service's store. Events and reminders share one: it is emptied, and removed only
  // when the account has the other of the two turned off.
  void removeDataStoreForDataclass(std::string_view dataclass);
  // Empties the device-local store of calendars or reminders and hides it; of another dataclass,
  // turns it off for the device-local account and removes the store.
  void removeLocalDataStoreForDataclass(std::string_view dataclass);
  // The device-local account takes over the dataclass: it is turned on for it, and its source is
  // created and committed, also when turning it on failed.
  void createLocalDataSourceForDataclass(std::string_view dataclass);
  // Forgets the sync state of the device-local source, so that the next tethered sync starts
  // afresh.
  void clearAnchorsForLocalDataclass(std::string_view dataclass);
  void hideLocalStoreForDataclass(std::string_view dataclass);
  void showLocalStoreIfAppropriateForDataclass(std::string_view dataclass);
  // Puts the device-local account into a fresh store and saves it.
  void saveDeviceLocalAccount();

 protected:
  const accountsettings::AccountPtr& _syncActionsAccount() const { return syncAccount_; }
  // Always none, whatever the class: no caller of the controller tells child accounts apart by
  // class.
  std::optional<std::string> _syncableChildAccountIDOfClass(std::string_view className) const;
  // The service's source of the dataclass; empty, and nothing logged, when the service account is
  // not known to the sync agent. Calendars are those of the account's calendar child, where it has
  // one.
  platform::DataSourcePtr _createQuillnetDataSourceForDataclass(std::string_view dataclass);

 private:
  void _commitAndClose(const platform::DataSourcePtr& local,
                       const platform::DataSourcePtr& service);
  void _closeServiceSource(const platform::DataSourcePtr& source);
  std::optional<std::string> _calendarChildIdentifier() const;

  accountsettings::AccountPtr syncAccount_;
  accountsettings::DeviceLocalAccountPtr deviceLocalAccount_;
  bool shouldSaveDeviceLocalAccount_ = false;
};

}  // namespace localdata
