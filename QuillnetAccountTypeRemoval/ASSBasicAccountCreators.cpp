// The full and sync account behind a record, made by classes of code bundles that are loaded on
// demand.

#include <mutex>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"
#include "QuillnetAccountTypeRemoval/Assertions.h"
#include "QuillnetAccountTypeRemoval/BundleAnchor.h"
#include "platform/Services.h"

namespace accountsettings {

using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr std::string_view kSourceFile = "ASSBasicAccount";
constexpr std::string_view kFullAccountCreator = "FullAccount";
constexpr std::string_view kSyncAccountCreator = "SyncAccount";

// Read once per process, also when it is missing.
std::once_flag creatorsOnce;
std::optional<Dictionary> CreatorsCatalog;

void loadFramework(const Dictionary& description, std::string_view creatorType,
                   const std::optional<std::string>& type) {
  const propertylist::Text* framework = propertylist::findString(description, "Framework");
  if (framework == nullptr)
    raiseAssertionFailure(kSourceFile, __LINE__,
                          "Malformed AccountCreators information. Could not find the path to the "
                          "framework for the %@ with type %@",
                          creatorType, type);
  const platform::Services& services = platform::services();
  const std::string path =
      platform::joinedPath(services.deviceInfo.systemRootDirectory(), *framework);
  if (const std::optional<std::string> error = services.classRegistry.loadLibrary(path))
    raiseAssertionFailure(kSourceFile, __LINE__,
                          "Could not load the account creator framework %@. Error %s", path, error);
}

// The class registered under `name`; null also without a name.
platform::RuntimeClass* classNamed(const std::optional<std::string>& name) {
  return name ? platform::services().classRegistry.classNamed(*name) : nullptr;
}

}  // namespace

std::optional<Dictionary> ASSBasicAccount::_creatorsInfo() {
  const platform::Services& services = platform::services();
  const std::optional<std::string> path =
      services.bundleResources.pathForResource(bundleAnchor(), "AccountCreators", "plist");
  if (!path) return std::nullopt;
  const propertylist::FileReadResult read = services.fileServices.readPropertyListFile(*path);
  const Dictionary* creators = read.value ? read.value->asDictionary() : nullptr;
  return creators != nullptr ? std::optional(*creators) : std::nullopt;
}

const std::optional<Dictionary>& ASSBasicAccount::_accountCreationMap() {
  std::call_once(creatorsOnce, [] { CreatorsCatalog = _creatorsInfo(); });
  return CreatorsCatalog;
}

std::optional<std::string> ASSBasicAccount::_creatorClassNameForAccountTypeCreatorTypeLoader(
    const std::optional<std::string>& type, std::string_view creatorType,
    FullAccountLoader* loader) const {
  const std::optional<Dictionary>& map = _accountCreationMap();
  const Array* entries = map ? propertylist::findArray(*map, type.value_or("")) : nullptr;
  if (entries == nullptr)
    raiseAssertionFailure(kSourceFile, __LINE__,
                          "Malformed AccountCreators information. Could not find the information "
                          "for the type %@",
                          type);
  // Every matching entry is gone through and its bundle loaded; the last one names the class.
  std::optional<std::string> result;
  for (const Value& value : *entries) {
    const Dictionary* entry = value.asDictionary();
    const propertylist::Text* entryType =
        entry != nullptr ? propertylist::findString(*entry, "Type") : nullptr;
    if (entryType == nullptr || *entryType != creatorType) continue;
    const Dictionary* description = propertylist::findDictionary(*entry, "Description");
    if (description == nullptr)
      raiseAssertionFailure(kSourceFile, __LINE__,
                            "Malformed AccountCreators information. Could not find the description "
                            "for the %@ with type %@",
                            creatorType, type);
    const bool loaderLoadedIt = loader != nullptr && creatorType == kFullAccountCreator &&
                                loader->loadBundleForAccountWithProperties(properties_);
    if (!loaderLoadedIt) loadFramework(*description, creatorType, type);
    const propertylist::Text* className = propertylist::findString(*description, "Class");
    if (className == nullptr || className->empty())
      raiseAssertionFailure(kSourceFile, __LINE__,
                            "Malformed AccountCreators information. Could not find the name of the "
                            "class that creates %@ with the type %@",
                            creatorType, type);
    result = *className;
  }
  return result;
}

std::optional<std::string> ASSBasicAccount::fullAccountCreatorClassNameForAccountTypeLoader(
    const std::optional<std::string>& type, FullAccountLoader* loader) const {
  return _creatorClassNameForAccountTypeCreatorTypeLoader(type, kFullAccountCreator, loader);
}

std::optional<std::string> ASSBasicAccount::syncAccountCreatorClassNameForAccountType(
    const std::optional<std::string>& type) const {
  return _creatorClassNameForAccountTypeCreatorTypeLoader(type, kSyncAccountCreator, nullptr);
}

FullAccountPtr ASSBasicAccount::fullAccountUsingLoader(FullAccountLoader* loader) {
  if (fullAccount_) return fullAccount_;
  const std::optional<std::string> accountType = type();
  const std::optional<std::string> name =
      fullAccountCreatorClassNameForAccountTypeLoader(accountType, loader);
  platform::RuntimeClass* const creator = classNamed(name);
  if (creator == nullptr)
    raiseAssertionFailure(kSourceFile, __LINE__,
                          "The framework/bundle where %@ is defined has not been loaded", name);
  FullAccountPtr created;
  if (auto* const naming = dynamic_cast<FullAccountClassCreator*>(creator)) {
    auto* const named =
        dynamic_cast<FullAccountClass*>(naming->classForAccountType(accountType.value_or("")));
    if (named != nullptr) created = named->initWithProperties(properties_);
  } else if (auto* const making = dynamic_cast<FullAccountCreator*>(creator)) {
    created = making->accountWithBasicAccount(shared_from_this());
  }
  if (!created)
    raiseAssertionFailure(kSourceFile, __LINE__,
                          "Could not create the account with class %@ and id %@", name,
                          identifier());
  created->setParentAccount(parentAccount_);
  setFullAccount(created);
  return fullAccount_;
}

void ASSBasicAccount::setFullAccount(const FullAccountPtr& account) { fullAccount_ = account; }

SyncAccountPtr ASSBasicAccount::_cachedSyncAccount() {
  if (syncAccount_) return syncAccount_;
  const std::optional<std::string> name = syncAccountCreatorClassNameForAccountType(type());
  if (!name) return nullptr;
  platform::RuntimeClass* const found = classNamed(name);
  if (found == nullptr) {
    platform::logToSystem(
        "ERROR: The framework/bundle where %@ is defined has not been loaded, so there is no "
        "syncable account for basic account with properties %@",
        name, properties_);
    return nullptr;
  }
  if (auto* const creator = dynamic_cast<SyncAccountCreator*>(found))
    syncAccount_ = creator->accountToRefreshForBasicAccount(shared_from_this());
  if (!syncAccount_)
    platform::logToSystem("ERROR: Could not create the account with class %@ and id %@", name,
                          identifier());
  return syncAccount_;
}

bool ASSBasicAccount::refreshContainerWithIdentifierForDataclassIsUserRequested(
    std::string_view containerIdentifier, std::string_view dataclass, bool isUserRequested) {
  const SyncAccountPtr account = _cachedSyncAccount();
  return account && account->refreshContainerWithIdentifierForDataclassIsUserRequested(
                        containerIdentifier, dataclass, isUserRequested);
}

bool ASSBasicAccount::refreshContainerListForDataclassIsUserRequested(std::string_view dataclass,
                                                                      bool isUserRequested) {
  const SyncAccountPtr account = _cachedSyncAccount();
  return account &&
         account->refreshContainerListForDataclassIsUserRequested(dataclass, isUserRequested);
}

bool ASSBasicAccount::refreshContainersForDataclassIsUserRequested(std::string_view dataclass,
                                                                   bool isUserRequested) {
  const SyncAccountPtr account = _cachedSyncAccount();
  return account &&
         account->refreshContainersForDataclassIsUserRequested(dataclass, isUserRequested);
}

bool ASSBasicAccount::refreshContainerWithIdentifierForDataclass(
    std::string_view containerIdentifier, std::string_view dataclass) {
  return refreshContainerWithIdentifierForDataclassIsUserRequested(containerIdentifier, dataclass,
                                                                   false);
}

bool ASSBasicAccount::refreshContainerListForDataclass(std::string_view dataclass) {
  return refreshContainerListForDataclassIsUserRequested(dataclass, false);
}

bool ASSBasicAccount::refreshContainersForDataclass(std::string_view dataclass) {
  return refreshContainersForDataclassIsUserRequested(dataclass, false);
}

void ASSBasicAccount::renewAccountCredentialsWithHandler(const std::function<void(int)>& handler) {
  constexpr int kNothingRenewed = 3;
  handler(kNothingRenewed);
}

}  // namespace accountsettings
