#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "QuillnetAccountTypeRemoval/AccountCreatorClasses.h"
#include "platform/LogFormat.h"

// The accounts that the sample services make. They reach no server: what they are asked goes to the
// image's journals. A record is used through its virtual and inline operations alone, because the
// account settings library lies in another object of the process.
namespace accountservices {

// A full account. It tells who it is through its description: "<CLASS: ID>", for a child account
// "<CLASS: ID, child of PARENT>".
class ServiceAccount : public accountsettings::AccountFullAccountProtocol,
                       public platform::Describable {
 public:
  ServiceAccount(std::string className, std::string identifier);
  void setParentAccount(const accountsettings::AccountPtr& parent) override;
  std::string description() const override;

 private:
  std::string _className;
  std::string _identifier;
  std::optional<std::string> _parentIdentifier;
};

// A sync account. Answers true for the dataclasses it serves, and notes every request.
class ServiceSyncAccount : public accountsettings::AccountSyncAccountProtocol {
 public:
  ServiceSyncAccount(std::string service, std::string accountIdentifier,
                     std::vector<std::string_view> dataclasses);
  bool refreshContainerWithIdentifierForDataclassIsUserRequested(
      std::string_view containerIdentifier, std::string_view dataclass,
      bool isUserRequested) override;
  bool refreshContainerListForDataclassIsUserRequested(std::string_view dataclass,
                                                       bool isUserRequested) override;
  bool refreshContainersForDataclassIsUserRequested(std::string_view dataclass,
                                                    bool isUserRequested) override;

 private:
  bool _answer(std::string_view request, std::optional<std::string_view> container,
               std::string_view dataclass, bool isUserRequested) const;

  std::string _service;
  std::string _accountIdentifier;
  std::vector<std::string_view> _dataclasses;  // constants
};

}  // namespace accountservices
