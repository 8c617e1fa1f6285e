#include "QuillnetAccountTypeRemoval/ASSDeviceLocalAccount.h"

#include "QuillnetAccountTypeRemoval/BundleAnchor.h"
#include "platform/Services.h"

namespace accountsettings {

using propertylist::Dictionary;

namespace {

// The class as creators of full accounts are looked up: by name.
class DeviceLocalAccountClass final : public platform::RuntimeClass, public FullAccountCreator {
 public:
  DeviceLocalAccountClass() { platform::registerClass(*this); }
  std::string className() const override { return "ASSDeviceLocalAccount"; }
  FullAccountPtr accountWithBasicAccount(const AccountPtr& account) override {
    return ASSDeviceLocalAccount::accountWithBasicAccount(*account);
  }
};

// Never destroyed: the registry answers it until the process is gone.
auto& deviceLocalAccountClass = *new DeviceLocalAccountClass;

}  // namespace

DeviceLocalAccountPtr ASSDeviceLocalAccount::accountWithProperties(const Dictionary& properties) {
  return initWithProperties(properties);
}

DeviceLocalAccountPtr ASSDeviceLocalAccount::initWithProperties(const Dictionary& properties) {
  return _recordWithProperties<ASSDeviceLocalAccount>(properties);
}

DeviceLocalAccountPtr ASSDeviceLocalAccount::accountWithBasicAccount(
    const ASSBasicAccount& account) {
  return initWithProperties(account.properties());
}

Dictionary ASSDeviceLocalAccount::basicAccountProperties(std::string_view receivingClass) {
  const std::string name = classTypeString();
  return {{kAccountType, kOnMyDeviceAccountType},
          {kAccountClass, receivingClass},
          {kAccountTypeString, name},
          {kAccountShortTypeString, name},
          {kAccountIdentifier, _identifier()}};
}

std::string ASSDeviceLocalAccount::classTypeString() {
  const platform::Services& services = platform::services();
  std::string deviceClass = services.deviceInfo.queryValue("DeviceClass").value_or("Kallo");
  for (char& c : deviceClass) {
    if (c >= 'a' && c <= 'z')
      c = static_cast<char>(c - 'a' + 'A');
    else if (c == ' ')
      c = '_';
  }
  const std::string key = platform::formatLogLine("%@_%@", {"ON_MY_DEVICE_TYPE", deviceClass});
  return services.bundleResources.localizedString(bundleAnchor(), key, "DeviceLocalAccount");
}

std::optional<propertylist::Text> ASSDeviceLocalAccount::identifier() const {
  return _identifier();
}

std::optional<propertylist::Text> ASSDeviceLocalAccount::syncStoreIdentifier() const {
  return identifier();
}

void ASSDeviceLocalAccount::setParentAccount(const AccountPtr& parent) {
  ASSBasicAccount::setParentAccount(parent);
}

std::optional<std::string> ASSDeviceLocalAccount::displayName() const { return classTypeString(); }

}  // namespace accountsettings
