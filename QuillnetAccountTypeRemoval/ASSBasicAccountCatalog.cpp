// The policy questions of ASSBasicAccount, answered from the catalogues of account types and
// dataclasses.

#include <algorithm>
#include <array>
#include <atomic>
#include <iterator>
#include <mutex>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"
#include "QuillnetAccountTypeRemoval/Assertions.h"
#include "QuillnetAccountTypeRemoval/BundleAnchor.h"
#include "QuillnetAccountTypeRemoval/PropertyNumbers.h"
#include "platform/Services.h"

namespace accountsettings {

using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr std::string_view kSourceFile = "ASSBasicAccount";

// Both catalogues live until the process ends and are never changed once loaded.
std::mutex accountTypesLock;
std::optional<Dictionary> AccountTypesCatalog;
std::atomic<bool> accountTypesAreLoaded = false;
std::once_flag dataclassesOnce;
std::optional<Dictionary> DataclassesCatalog;

// The entries that name a known dataclass, in their own order and as often as they stand there.
// When there is none the list stays as it is, so that a type that lists only what this version does
// not know keeps its list.
Array normalisedDataclasses(const Array& dataclasses, bool notesAreSynced) {
  const StringList& known = ASSBasicAccount::allSupportedDataclasses();
  std::vector<Value> kept;
  for (const Value& dataclass : dataclasses) {
    const propertylist::Text* name = dataclass.asString();
    if (name == nullptr || !contains(known, *name)) continue;
    if (*name == kAccountDataclassNotes && !notesAreSynced) continue;
    kept.push_back(dataclass);
  }
  return kept.empty() ? dataclasses : Array(std::move(kept));
}

Dictionary loadedAccountTypes() {
  const platform::Services& services = platform::services();
  const std::optional<std::string> path =
      services.bundleResources.pathForResource(bundleAnchor(), "AccountTypesProperties", "plist");
  if (!path)
    raiseAssertionFailure(kSourceFile, __LINE__, "Could not find AccountTypesProperties.plist");
  const propertylist::FileReadResult read = services.fileServices.readPropertyListFile(*path);
  const Dictionary* types = read.value ? read.value->asDictionary() : nullptr;
  if (types == nullptr)
    raiseAssertionFailure(kSourceFile, __LINE__,
                          "Could not load the dataclasses configuration file");

  const bool notesAreSynced = ASSBasicAccount::isMultitaskingEnabled();
  Dictionary normalised = *types;
  for (const Dictionary::Entry& entry : *types) {
    const Dictionary* type = entry.value().asDictionary();
    if (type == nullptr) continue;
    const Array* dataclasses = propertylist::findArray(*type, kPropertiesSupportedDataclasses);
    if (dataclasses == nullptr) continue;
    Dictionary copy = *type;
    copy.set(kPropertiesSupportedDataclasses, normalisedDataclasses(*dataclasses, notesAreSynced));
    normalised.set(entry.key(), std::move(copy));
  }
  return normalised;
}

// The catalogue's entry of a type, or null.
const Dictionary* entryOfType(std::string_view type) {
  ASSBasicAccount::initialize();
  return propertylist::findDictionary(*AccountTypesCatalog, type);
}

std::optional<StringList> listOfType(std::string_view type, std::string_view key) {
  const Dictionary* entry = entryOfType(type);
  return entry != nullptr ? stringsOfArray(entry->find(key)) : std::nullopt;
}

std::optional<StringList> toggleActions(std::string_view dataclass, std::string_view type,
                                        std::string_view key) {
  std::optional<StringList> actions = listOfType(type, key);
  if (actions && !ASSBasicAccount::multipleStoresSupportedByDataclass(dataclass))
    return ASSBasicAccount::removeActionsIncompatibleWithSingleStoreDataclass(*actions);
  return actions;
}

}  // namespace

void ASSBasicAccount::initialize() {
  if (accountTypesAreLoaded) return;
  const std::lock_guard lock(accountTypesLock);
  if (!AccountTypesCatalog) AccountTypesCatalog = loadedAccountTypes();
  accountTypesAreLoaded = true;
}

bool ASSBasicAccount::_isValidAccountType(std::optional<std::string_view> type) {
  initialize();
  return type && !type->empty() && AccountTypesCatalog->contains(*type);
}

bool ASSBasicAccount::isMultitaskingEnabled() {
  return platform::services().deviceInfo.queryValue("CPUArchitecture") != "armv6";
}

const StringList& ASSBasicAccount::allSupportedDataclasses() {
  static const StringList dataclasses = [] {
    constexpr std::array kInOrder = {
        kAccountDataclassMail,           kAccountDataclassContacts,
        kAccountDataclassCalendars,      kAccountDataclassReminders,
        kAccountDataclassBookmarks,      kAccountDataclassNotes,
        kAccountDataclassMediaStream,    kAccountDataclassDeviceLocator,
        kAccountDataclassContactsSearch, kAccountDataclassBackup,
        kAccountDataclassUbiquity,       kAccountDataclassKeyValue,
        kAccountDataclassShoebox,        kAccountDataclassSharedStreams};
    return StringList(kInOrder.begin(), kInOrder.end());
  }();
  return dataclasses;
}

std::optional<NameList> ASSBasicAccount::_namesSupportedForAccountType(std::string_view type) {
  const Dictionary* entry = entryOfType(type);
  return entry != nullptr ? namesOfArray(entry->find(kPropertiesSupportedDataclasses))
                          : std::nullopt;
}

std::optional<StringList> ASSBasicAccount::supportedDataclassesForAccountType(
    std::string_view type) {
  return listOfType(type, kPropertiesSupportedDataclasses);
}

std::optional<StringList> ASSBasicAccount::userActionsToEnableDataclassForAccountType(
    std::string_view dataclass, std::string_view type) {
  return toggleActions(dataclass, type, kPropertiesEnableDataclassActions);
}

std::optional<StringList> ASSBasicAccount::userActionsToDisableDataclassForAccountType(
    std::string_view dataclass, std::string_view type) {
  return toggleActions(dataclass, type, kPropertiesDisableDataclassActions);
}

StringList ASSBasicAccount::removeActionsIncompatibleWithSingleStoreDataclass(
    const StringList& actions) {
  initialize();
  StringList kept = actions;
  const auto last = std::find(kept.rbegin(), kept.rend(), kDataclassToggleActionKeepLocalData);
  if (last != kept.rend()) kept.erase(std::next(last).base());
  return kept;
}

std::optional<StringList> ASSBasicAccount::deleteAccountActionsForAccountType(
    std::string_view type) {
  return listOfType(type, kPropertiesDeleteAccountActions);
}

bool ASSBasicAccount::showRemindersSeparatelyForAccountType(std::string_view type) {
  const Dictionary* entry = entryOfType(type);
  return entry != nullptr && booleanValue(entry->find(kPropertiesShowRemindersSeparately));
}

std::optional<Dictionary> ASSBasicAccount::_dataclassesProperties() {
  initialize();
  const platform::Services& services = platform::services();
  const std::optional<std::string> path =
      services.bundleResources.pathForResource(bundleAnchor(), "DataclassesProperties", "plist");
  if (!path) return std::nullopt;
  const propertylist::FileReadResult read = services.fileServices.readPropertyListFile(*path);
  const Dictionary* properties = read.value ? read.value->asDictionary() : nullptr;
  return properties != nullptr ? std::optional(*properties) : std::nullopt;
}

bool ASSBasicAccount::_flagOfDataclass(std::string_view dataclass, std::string_view flag) {
  initialize();
  std::call_once(dataclassesOnce, [] { DataclassesCatalog = _dataclassesProperties(); });
  if (!DataclassesCatalog) return false;
  const Dictionary* entry = propertylist::findDictionary(*DataclassesCatalog, dataclass);
  return entry != nullptr && booleanValue(entry->find(flag));
}

bool ASSBasicAccount::multipleStoresSupportedByDataclass(std::string_view dataclass) {
  return _flagOfDataclass(dataclass, kDataclassSupportsMultipleStores);
}

bool ASSBasicAccount::displayToggleForDataclass(std::string_view dataclass) {
  return _flagOfDataclass(dataclass, kDataclassDisplaySwitch);
}

bool ASSBasicAccount::userConfirmationIsRequiredByDataclass(std::string_view dataclass) {
  return _flagOfDataclass(dataclass, kDataclassRequiresUserConfirmation);
}

}  // namespace accountsettings
