#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "QuillnetAccountTypeRemoval/AccountCreatorClasses.h"

// The kinds of class object that the sample services register. Each registers itself when it is
// made, and so while the bundle that holds it is loaded.
namespace accountservices {

// A class object that is never destroyed: the registry answers it until the process is gone, also
// to what runs at its exit.
template <typename Class, typename... Arguments>
Class& kept(Arguments&&... arguments) {
  return *new Class(std::forward<Arguments>(arguments)...);
}

// A class object with a name.
class NamedClass : public platform::RuntimeClass {
 public:
  explicit NamedClass(std::string name) : _name(std::move(name)) {}
  std::string className() const override { return _name; }

 private:
  std::string _name;
};

// A class of full accounts.
class ServiceAccountClass : public NamedClass, public accountsettings::FullAccountClass {
 public:
  explicit ServiceAccountClass(std::string name);
  // Null for properties without an identifier.
  accountsettings::FullAccountPtr initWithProperties(
      const propertylist::Dictionary& properties) override;
};

// Makes full accounts by naming their class, for the types it serves.
class NamingAccountCreator : public NamedClass, public accountsettings::FullAccountClassCreator {
 public:
  NamingAccountCreator(std::string name, ServiceAccountClass& accountClass,
                       std::vector<std::string_view> types);
  platform::RuntimeClass* classForAccountType(std::string_view type) override;

 private:
  ServiceAccountClass& _accountClass;
  std::vector<std::string_view> _types;  // constants
};

// Makes full accounts itself, as objects that call themselves `accountClassName`.
class MakingAccountCreator : public NamedClass, public accountsettings::FullAccountCreator {
 public:
  MakingAccountCreator(std::string name, std::string accountClassName);
  // Null for a record without an identifier.
  accountsettings::FullAccountPtr accountWithBasicAccount(
      const accountsettings::AccountPtr& account) override;

 private:
  std::string _accountClassName;
};

// Makes sync accounts that serve the dataclasses.
class ServiceSyncAccountCreator : public NamedClass, public accountsettings::SyncAccountCreator {
 public:
  ServiceSyncAccountCreator(std::string name, std::string service,
                            std::vector<std::string_view> dataclasses);
  // Null for a record without an identifier.
  accountsettings::SyncAccountPtr accountToRefreshForBasicAccount(
      const accountsettings::AccountPtr& account) override;

 private:
  std::string _service;
  std::vector<std::string_view> _dataclasses;  // constants
};

// Notes all that it hears.
class ServiceNotifier : public NamedClass,
                        public accountsettings::AccountChangesNotifier,
                        public accountsettings::AccountWillChangeNotifier,
                        public accountsettings::AccountDidChangeNotifier {
 public:
  explicit ServiceNotifier(std::string name);
  void noteAccountChanges(const propertylist::Array& changes) override;
  void accountWillChangeForDataclass(const std::string& accountIdentifier,
                                     std::string_view dataclass) override;
  void accountDidChangeForDataclass(const std::string& accountIdentifier,
                                    std::string_view dataclass) override;
};

}  // namespace accountservices
