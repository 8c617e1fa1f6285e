#include "accountservices/ServiceClasses.h"

#include <algorithm>
#include <memory>
#include <optional>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"
#include "accountservices/Journals.h"
#include "accountservices/ServiceAccounts.h"

namespace accountservices {

using accountsettings::AccountPtr;

ServiceAccountClass::ServiceAccountClass(std::string name) : NamedClass(std::move(name)) {
  platform::registerClass(*this);
}

accountsettings::FullAccountPtr ServiceAccountClass::initWithProperties(
    const propertylist::Dictionary& properties) {
  const propertylist::Text* const identifier =
      propertylist::findString(properties, accountsettings::kAccountIdentifier);
  if (identifier == nullptr) return nullptr;
  return std::make_shared<ServiceAccount>(className(), *identifier);
}

NamingAccountCreator::NamingAccountCreator(std::string name, ServiceAccountClass& accountClass,
                                           std::vector<std::string_view> types)
    : NamedClass(std::move(name)), _accountClass(accountClass), _types(std::move(types)) {
  platform::registerClass(*this);
}

platform::RuntimeClass* NamingAccountCreator::classForAccountType(std::string_view type) {
  return std::find(_types.begin(), _types.end(), type) == _types.end() ? nullptr : &_accountClass;
}

MakingAccountCreator::MakingAccountCreator(std::string name, std::string accountClassName)
    : NamedClass(std::move(name)), _accountClassName(std::move(accountClassName)) {
  platform::registerClass(*this);
}

accountsettings::FullAccountPtr MakingAccountCreator::accountWithBasicAccount(
    const AccountPtr& account) {
  const std::optional<std::string> identifier = account->identifier();
  if (!identifier) return nullptr;
  return std::make_shared<ServiceAccount>(_accountClassName, *identifier);
}

ServiceSyncAccountCreator::ServiceSyncAccountCreator(std::string name, std::string service,
                                                     std::vector<std::string_view> dataclasses)
    : NamedClass(std::move(name)),
      _service(std::move(service)),
      _dataclasses(std::move(dataclasses)) {
  platform::registerClass(*this);
}

accountsettings::SyncAccountPtr ServiceSyncAccountCreator::accountToRefreshForBasicAccount(
    const AccountPtr& account) {
  const std::optional<std::string> identifier = account->identifier();
  if (!identifier) return nullptr;
  return std::make_shared<ServiceSyncAccount>(_service, *identifier, _dataclasses);
}

ServiceNotifier::ServiceNotifier(std::string name) : NamedClass(std::move(name)) {
  platform::registerClass(*this);
}

void ServiceNotifier::noteAccountChanges(const propertylist::Array& changes) {
  journalChanges(className(), changes);
}

void ServiceNotifier::accountWillChangeForDataclass(const std::string& accountIdentifier,
                                                    std::string_view dataclass) {
  journalDataclassChange(className(), "will change", accountIdentifier, dataclass);
}

void ServiceNotifier::accountDidChangeForDataclass(const std::string& accountIdentifier,
                                                   std::string_view dataclass) {
  journalDataclassChange(className(), "did change", accountIdentifier, dataclass);
}

}  // namespace accountservices
