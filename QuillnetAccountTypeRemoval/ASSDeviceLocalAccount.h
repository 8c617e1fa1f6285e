#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"
#include "platform/SyncDataSource.h"

namespace accountsettings {

class ASSDeviceLocalAccount;
using DeviceLocalAccountPtr = std::shared_ptr<ASSDeviceLocalAccount>;

// The account of the data that lives on the device alone. Every device has one, always with the
// same identifier, shown under a localised name made from the device class. It has no properties of
// its own beyond those of a record; whatever identifier, sync identifier or display name is stored,
// it answers its fixed ones.
//
// The operations under "Local stores" reach the platform's stores. They log what fails and raise
// nothing; they are defined in localdata/.
class ASSDeviceLocalAccount : public ASSBasicAccount, public AccountFullAccountProtocol {
 public:
  using ASSBasicAccount::ASSBasicAccount;

  static DeviceLocalAccountPtr accountWithProperties(const propertylist::Dictionary& properties);
  // As for every record: the type must be in the catalogue and a class is required.
  static DeviceLocalAccountPtr initWithProperties(const propertylist::Dictionary& properties);
  // A device-local account with the properties of `account`, which is not kept. Makes the class fit
  // to create the full account of a record of type "OnMyDevice".
  static DeviceLocalAccountPtr accountWithBasicAccount(const ASSBasicAccount& account);
  // The properties of a new device-local account. They hold no sync identifier: the account answers
  // its identifier for it. `receivingClass` is the name of the class that the account will have.
  static propertylist::Dictionary basicAccountProperties(
      std::string_view receivingClass = "ASSDeviceLocalAccount");
  // The localised name of the device-local account on this class of device; the key of the string
  // table where the table has no text for it. (The record's own typeString answers what is stored.)
  static std::string classTypeString();

  std::optional<propertylist::Text> identifier() const override;
  std::optional<propertylist::Text> syncStoreIdentifier() const override;
  std::optional<std::string> displayName() const override;
  std::string className() const override { return "ASSDeviceLocalAccount"; }
  void setParentAccount(const AccountPtr& parent) override;

  // --- Local stores (AccountSettingsUI) ---

  static std::string displayedShortAccountTypeString();
  static std::string displayedAccountTypeString();
  // Opens the device-local source of the dataclass: events only for calendars, reminders only for
  // reminders. `options` are added, and win over these. The caller closes what comes back; it may
  // be empty, and may come although the platform reported a failure, which is logged.
  static platform::DataSourcePtr createSyncDataSourceForDataclassOptions(
      std::string_view dataclass, const platform::DataSourceOptions& options);

  bool supportsPush() const { return false; }
  std::optional<std::string> uniqueId() const { return identifier(); }
  // Turns tethered syncing of the dataclass on or off and, only when that was done, records the
  // dataclass as enabled or not.
  void setEnabledForDataclass(bool enabled, std::string_view dataclass) override;
  // Turns tethered syncing on or off and leaves the account's own list alone.
  void setTetheredEnabledForDataclass(bool enabled, std::string_view dataclass);
  // Removes the device-local store of the dataclass.
  void deleteLocalDataSourceForDataclass(std::string_view dataclass);
  // Whether another source than the device-local one serves the dataclass; also true when the
  // platform cannot tell.
  bool otherAccountEnabledForDataclass(std::string_view dataclass) const;
  // Shows the local contacts, calendar or reminders store unless another account serves the
  // dataclass and the device holds nothing of it. Nothing for other dataclasses.
  void showLocalStoreIfAppropriateForDataclass(std::string_view dataclass);
  // Hides the local contacts, calendar or reminders store, also when it is the only one.
  void hideLocalStoreForDataclass(std::string_view dataclass);

 protected:
  static propertylist::Text _identifier() { return "DeviceLocalAccount"; }
  // True when tethered syncing of the dataclass was turned on or off.
  bool _setTetheredDataSourceEnabledForDataclass(bool enabled, std::string_view dataclass);
  // With a source: whether closing it succeeded, whatever removing the store gave. Without one:
  // whether the platform called opening it a success.
  bool _deleteDataSourceForDataclass(std::string_view dataclass);
  // Puts this account into a fresh store and saves it.
  void _saveChangesToOnMyDeviceAccount();
};

}  // namespace accountsettings
