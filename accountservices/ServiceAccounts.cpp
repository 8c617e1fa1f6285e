#include "accountservices/ServiceAccounts.h"

#include <algorithm>
#include <utility>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"
#include "accountservices/Journals.h"

namespace accountservices {

ServiceAccount::ServiceAccount(std::string className, std::string identifier)
    : _className(std::move(className)), _identifier(std::move(identifier)) {}

void ServiceAccount::setParentAccount(const accountsettings::AccountPtr& parent) {
  _parentIdentifier = parent ? parent->identifier() : std::nullopt;
}

std::string ServiceAccount::description() const {
  return "<" + _className + ": " + _identifier +
         (_parentIdentifier ? ", child of " + *_parentIdentifier : "") + ">";
}

ServiceSyncAccount::ServiceSyncAccount(std::string service, std::string accountIdentifier,
                                       std::vector<std::string_view> dataclasses)
    : _service(std::move(service)),
      _accountIdentifier(std::move(accountIdentifier)),
      _dataclasses(std::move(dataclasses)) {}

bool ServiceSyncAccount::refreshContainerWithIdentifierForDataclassIsUserRequested(
    std::string_view containerIdentifier, std::string_view dataclass, bool isUserRequested) {
  return _answer("container", containerIdentifier, dataclass, isUserRequested);
}

bool ServiceSyncAccount::refreshContainerListForDataclassIsUserRequested(std::string_view dataclass,
                                                                         bool isUserRequested) {
  return _answer("container list", std::nullopt, dataclass, isUserRequested);
}

bool ServiceSyncAccount::refreshContainersForDataclassIsUserRequested(std::string_view dataclass,
                                                                      bool isUserRequested) {
  return _answer("containers", std::nullopt, dataclass, isUserRequested);
}

bool ServiceSyncAccount::_answer(std::string_view request,
                                 std::optional<std::string_view> container,
                                 std::string_view dataclass, bool isUserRequested) const {
  const bool isServed =
      std::find(_dataclasses.begin(), _dataclasses.end(), dataclass) != _dataclasses.end();
  journalRefresh(
      {_service, _accountIdentifier, request, container, dataclass, isUserRequested, isServed});
  return isServed;
}

}  // namespace accountservices
