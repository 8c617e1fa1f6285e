// Telling the notifier classes of code bundles what changed.

#include <set>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "QuillnetAccountTypeRemoval/Assertions.h"
#include "QuillnetAccountTypeRemoval/BundleAnchor.h"
#include "platform/Services.h"

namespace accountsettings {

using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr std::string_view kSourceFile = "ASSAccountsManager";

// Operators know the failures of this file by these lines.
constexpr int kWillChangeLine = 638;
constexpr int kDidChangeLine = 652;
constexpr int kNoEntryLine = 820;
constexpr int kNoFrameworkLine = 829;
constexpr int kNotLoadedLine = 834;
constexpr int kNoClassNameLine = 842;
constexpr int kSendingLine = 992;

NameList enabledOf(const std::optional<Dictionary>& properties) {
  if (!properties) return {};
  return namesOfArray(properties->find(kAccountEnabledDataclasses)).value_or(NameList());
}

// A string of the current properties or, where they have none, of the original ones.
const propertylist::Text* stringOfEither(const std::optional<Dictionary>& current,
                                         const std::optional<Dictionary>& original,
                                         std::string_view key) {
  const propertylist::Text* string = current ? propertylist::findString(*current, key) : nullptr;
  if (string == nullptr && original) string = propertylist::findString(*original, key);
  return string;
}

// What a change of the account is told for: not which dataclasses are on (that is looked at apart),
// nor its children, nor whether it is active.
Dictionary comparable(Dictionary properties) {
  properties.remove(kAccountEnabledDataclasses);
  properties.remove(kAccountChildAccounts);
  properties.remove("IsActive");
  return properties;
}

// Views of what both dictionaries hold.
NameSet affectedDataclasses(AccountChangeType change, const std::optional<Dictionary>& original,
                            const std::optional<Dictionary>& current) {
  const NameList before = enabledOf(original);
  const NameList now = enabledOf(current);
  const NameSet beforeSet(before.begin(), before.end());
  const NameSet nowSet(now.begin(), now.end());
  if (change == AccountChangeType::deleted) return beforeSet;
  if (change == AccountChangeType::added) return nowSet;
  NameSet affected;
  for (const std::string_view dataclass : beforeSet) {
    if (!nowSet.contains(dataclass)) affected.insert(dataclass);
  }
  for (const std::string_view dataclass : nowSet) {
    if (!beforeSet.contains(dataclass)) affected.insert(dataclass);
  }
  // Any other change concerns every dataclass that is still on; with none on, nobody.
  if (!nowSet.empty() &&
      comparable(original.value_or(Dictionary())) != comparable(current.value_or(Dictionary())))
    affected.insert(nowSet.begin(), nowSet.end());
  return affected;
}

// Ends at the first value that is missing.
AccountChangeRecord changeRecord(AccountChangeType change, const propertylist::Text* identifier,
                                 const propertylist::Text* type,
                                 const std::optional<Dictionary>& original) {
  AccountChangeRecord record{{kASChangeAccountChangeTypeKey, static_cast<int>(change)}};
  if (identifier == nullptr) return record;
  record.set(kASChangeAccountIdentifierKey, *identifier);
  if (type == nullptr) return record;
  record.set(kASChangeAccountTypeKey, *type);
  const Array* enabled =
      original ? propertylist::findArray(*original, kAccountEnabledDataclasses) : nullptr;
  record.set(kASChangeAccountOriginallyEnabledDataclassesKey,
             enabled != nullptr ? *enabled : Array());
  return record;
}

void loadFramework(const Dictionary& description, const std::optional<std::string>& type) {
  const propertylist::Text* framework = propertylist::findString(description, "Framework");
  if (framework == nullptr)
    raiseAssertionFailure(kSourceFile, kNoFrameworkLine,
                          "Malformed AccountCreators information. Could not find the path to the "
                          "framework for the notifier with type %@",
                          type);
  const platform::Services& services = platform::services();
  const std::string path =
      platform::joinedPath(services.deviceInfo.systemRootDirectory(), *framework);
  if (const std::optional<std::string> error = services.classRegistry.loadLibrary(path))
    raiseAssertionFailure(kSourceFile, kNotLoadedLine,
                          "Could not load the account creator framework %@. Error %s", path, error);
}

// The class of a notifier, which must be there.
platform::RuntimeClass& notifierClass(const std::string& name, int line) {
  platform::RuntimeClass* const found = platform::services().classRegistry.classNamed(name);
  if (found == nullptr)
    raiseAssertionFailure(kSourceFile, line, "Could not find a class for class name %@", name);
  return *found;
}

}  // namespace

std::atomic<bool> ASSAccountsManager::shouldSkipNotifications = true;

void ASSAccountsManager::_setShouldSkipNotifications(bool skip) { shouldSkipNotifications = skip; }

StringList ASSAccountsManager::_notifierClassNamesForAccountTypeDataclass(
    const std::optional<std::string>& type, std::string_view dataclass) {
  const std::optional<Dictionary>& map = ASSBasicAccount::_accountCreationMap();
  const Array* entries = map ? propertylist::findArray(*map, type.value_or("")) : nullptr;
  if (entries == nullptr)
    raiseAssertionFailure(kSourceFile, kNoEntryLine,
                          "Malformed AccountCreators information. Could not find the information "
                          "for the type %@",
                          type);
  StringList names;
  for (const Value& value : *entries) {
    const Dictionary* entry = value.asDictionary();
    const propertylist::Text* entryType =
        entry != nullptr ? propertylist::findString(*entry, "Type") : nullptr;
    if (entryType == nullptr || *entryType != "NotifierAccount") continue;
    const Dictionary* description = propertylist::findDictionary(*entry, "Description");
    const Array* dataclasses = description != nullptr
                                   ? propertylist::findArray(*description, "Supported Dataclasses")
                                   : nullptr;
    if (dataclasses == nullptr || !dataclasses->contains(dataclass)) continue;
    loadFramework(*description, type);
    const propertylist::Text* className = propertylist::findString(*description, "Class");
    if (className == nullptr || className->empty())
      raiseAssertionFailure(kSourceFile, kNoClassNameLine,
                            "Malformed AccountCreators information. Could not find the name of the "
                            "class for notificatinos with the type %@",
                            type);
    names.push_back(*className);
  }
  return names;
}

void ASSAccountsManager::accountWillChangeForDataclass(const AccountPtr& account,
                                                       std::string_view dataclass) {
  for (const std::string& name :
       _notifierClassNamesForAccountTypeDataclass(account->type(), dataclass)) {
    platform::RuntimeClass& found = notifierClass(name, kWillChangeLine);
    if (auto* const notifier = dynamic_cast<AccountWillChangeNotifier*>(&found))
      notifier->accountWillChangeForDataclass(account->identifier().value_or(""), dataclass);
  }
}

void ASSAccountsManager::accountDidChangeForDataclass(const AccountPtr& account,
                                                      std::string_view dataclass) {
  for (const std::string& name :
       _notifierClassNamesForAccountTypeDataclass(account->type(), dataclass)) {
    platform::RuntimeClass& found = notifierClass(name, kDidChangeLine);
    if (auto* const notifier = dynamic_cast<AccountDidChangeNotifier*>(&found))
      notifier->accountDidChangeForDataclass(account->identifier().value_or(""), dataclass);
  }
}

void ASSAccountsManager::
    _addNotificationToDictionaryForChangeTypeOriginalPropertiesCurrentProperties(
        NotificationTable& table, AccountChangeType change,
        const std::optional<Dictionary>& original, const std::optional<Dictionary>& current) const {
  const propertylist::Text* type = stringOfEither(current, original, kAccountType);
  const propertylist::Text* identifier = stringOfEither(current, original, kAccountIdentifier);
  std::set<std::string> names;
  for (const std::string_view dataclass : affectedDataclasses(change, original, current)) {
    for (std::string& name : _notifierClassNamesForAccountTypeDataclass(
             type != nullptr ? std::optional(*type) : std::nullopt, dataclass))
      names.insert(std::move(name));
  }
  for (const std::string& name : names)
    table[name].append(changeRecord(change, identifier, type, original));
}

void ASSAccountsManager::_sendNotificationsForChangedAccounts() const {
  NotificationTable table;
  const auto add = [&](AccountChangeType change, const std::optional<Dictionary>& original,
                       const std::optional<Dictionary>& current) {
    _addNotificationToDictionaryForChangeTypeOriginalPropertiesCurrentProperties(table, change,
                                                                                 original, current);
  };
  for (const auto& [identifier, original] : originalAccountsByID_) {
    if (!topLevelAccountsByID_.contains(identifier))
      add(AccountChangeType::deleted, original, std::nullopt);
  }
  for (const auto& [identifier, account] : topLevelAccountsByID_) {
    if (!originalAccountsByID_.contains(identifier))
      add(AccountChangeType::added, std::nullopt, account->propertiesToSave());
  }
  for (const auto& [identifier, original] : originalAccountsByID_) {
    if (const AccountPtr* const current = topLevelAccountsByID_.find(identifier))
      add(AccountChangeType::modified, original, (*current)->propertiesToSave());
  }
  for (const auto& [name, changes] : table) {
    platform::RuntimeClass& found = notifierClass(name, kSendingLine);
    auto* const notifier = dynamic_cast<AccountChangesNotifier*>(&found);
    // Every notifier must hear of changes: one that cannot is a broken installation.
    if (notifier == nullptr)
      raiseAssertionFailure(kSourceFile, __LINE__, "%@ does not take account changes", name);
    notifier->noteAccountChanges(changes);
  }
}

std::optional<std::string>
ASSAccountsManager::displayNameForGroupOfAccountTypeForBeginningOfSentence(
    std::string_view type, bool beginningOfSentence) {
  if (type != kSubscribedCalendarAccountType) return std::nullopt;
  return platform::services().bundleResources.localizedString(
      bundleAnchor(),
      beginningOfSentence ? "SUBSCRIBED_CALENDAR_GROUP_TITLE"
                          : "SUBSCRIBED_CALENDAR_GROUP_MID_SENTENCE_TITLE",
      "AccountsManager");
}

}  // namespace accountsettings
