// How a store is made from the settings file.

#include <algorithm>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "QuillnetAccountTypeRemoval/PropertyNumbers.h"
#include "platform/Services.h"

namespace accountsettings {

using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

class MadeStore final : public ASSAccountsManager {};

constexpr std::size_t kMostExpectedAccounts = 100'000;
constexpr const char* kInitWithAccountsInfo = "-[ASSAccountsManager _initWithAccountsInfo:]";

AccountPtr accountFromInfo(const Dictionary& info) {
  const propertylist::Text* type = propertylist::findString(info, kAccountType);
  if (type != nullptr && *type == kOnMyDeviceAccountType)
    return ASSDeviceLocalAccount::initWithProperties(info);
  return ASSBasicAccount::initWithProperties(info);
}

// What the account answers as its identifier, as a value: the one that the account holds when it is
// that, which the device-local account's need not be.
std::optional<Value> sharedName(const ASSBasicAccount& account,
                                const std::optional<propertylist::Text>& identifier) {
  if (!identifier) return std::nullopt;
  const Value* const stored = account.accountPropertyForKey(kAccountIdentifier);
  const propertylist::Text* const text = stored != nullptr ? stored->asString() : nullptr;
  return text != nullptr && *text == *identifier ? *stored : Value(std::string_view(*identifier));
}

}  // namespace

ASSAccountsManager::ASSAccountsManager()
    : orderedTopLevelAccounts_(std::make_shared<AccountArray>()) {}

AccountsManagerPtr ASSAccountsManager::init() { return initInsideOfMigration(); }

AccountsManagerPtr ASSAccountsManager::initInsideOfMigration() {
  const auto store = std::make_shared<MadeStore>();
  static_cast<ASSAccountsManager&>(*store)._initFromSettingsFile();
  return store;
}

AccountsManagerPtr ASSAccountsManager::initWithAccounsInfoArray(
    const std::optional<Array>& accounts) {
  const auto store = std::make_shared<MadeStore>();
  static_cast<ASSAccountsManager&>(*store)._initWithAccountsInfo(accounts);
  return store;
}

std::string ASSAccountsManager::fullPathToAccountSettingsPlist() {
  return platform::joinedPath(platform::services().deviceInfo.systemRootDirectory(),
                              platform::formatLogLine("/var/mobile/Library/Preferences/%@",
                                                      {"com.vantor.accountsettings.plist"}));
}

std::string accountSettingsAccountsPath() {
  return ASSAccountsManager::fullPathToAccountSettingsPlist();
}

void ASSAccountsManager::_initFromSettingsFile() {
  const propertylist::FileReadResult read =
      platform::services().fileServices.readPropertyListFile(fullPathToAccountSettingsPlist());
  const Dictionary* root = read.value ? read.value->asDictionary() : nullptr;
  settingsFileIsUnreadable_ = read.exists && root == nullptr;
  const Array* accounts = root != nullptr ? propertylist::findArray(*root, "Accounts") : nullptr;
  _initWithAccountsInfo(accounts != nullptr ? std::optional(*accounts) : std::nullopt);
  if (root != nullptr) dataVersion_ = integerValue(root->find("Version"));
}

std::vector<RuntimeFixerPtr> ASSAccountsManager::_createRuntimeFixers() {
  return {ASSRuntimeFixMailAccount::init()};
}

void ASSAccountsManager::_initWithAccountsInfo(const std::optional<Array>& accounts) {
  runtimeFixers_ = _createRuntimeFixers();
  mayListOneTwice_ = runtimeFixers_.size() > 1;
  if (accounts) {
    bool fixedAny = false;
    // An entry need not be an account.
    const std::size_t expected = std::min(accounts->size(), kMostExpectedAccounts);
    orderedTopLevelAccounts_->reserve(expected);
    topLevelAccountsByID_.reserve(expected);
    for (const Value& info : *accounts) _loadAccount(info, fixedAny);
    if (fixedAny) {
      for (const RuntimeFixerPtr& fixer : runtimeFixers_) fixer->accountsHaveBeenSaved(false);
    }
  }
  // Where each account has been registered under an identifier of its own, the snapshot has these.
  if (!mayListOneTwice_ && topLevelAccountsByID_.size() == orderedTopLevelAccounts_->size()) {
    originalAccountsByID_ = topLevelAccountsByID_.withValues<Dictionary>(
        [](const AccountPtr& account) { return account->propertiesToSave(); });
  } else {
    _setOriginalAccountDictionaries();
  }
}

void ASSAccountsManager::_loadAccount(const Value& info, bool& fixedAny) {
  const Dictionary* properties = info.asDictionary();
  const AccountPtr account = properties != nullptr ? accountFromInfo(*properties) : nullptr;
  if (!account) {
    platform::logToSystem("[%s] ERROR: Failed to create a ASSBasicAccount from %@",
                          kInitWithAccountsInfo, info);
    return;
  }
  // An account is registered once for every fixer that keeps it. With the one fixer of a store that
  // is once or, when the fixer drops it, never.
  for (const RuntimeFixerPtr& fixer : runtimeFixers_) {
    const FixVerdict verdict =
        fixer->fixBasicAccountIfNeededLoggingMessage(account, "loading accounts");
    if (verdict != FixVerdict::nothingToDo) fixedAny = true;
    if (verdict != FixVerdict::couldNotFix) _register(account);
  }
}

void ASSAccountsManager::_register(const AccountPtr& account) {
  const std::optional<propertylist::Text> identifier = account->identifier();
  orderedTopLevelAccounts_->push_back(account);
  if (identifier) {
    try {
      topLevelAccountsByID_.set(*identifier, account);
    } catch (...) {
      orderedTopLevelAccounts_->pop_back();  // listed and registered, or neither
      throw;
    }
  }
  _loadChildren(account, identifier);
}

void ASSAccountsManager::_loadChildrenFromAccount(const AccountPtr& parent) {
  _loadChildren(parent, parent->identifier());
}

void ASSAccountsManager::_loadChildren(const AccountPtr& parent,
                                       const std::optional<propertylist::Text>& parentIdentifier) {
  _removeChildrenForAccountWithIdentifier(parentIdentifier);
  const Value* children = parent->accountPropertyForKey(kAccountChildAccounts);
  if (children == nullptr || children->asArray() == nullptr) return;
  const std::optional<Value> parentName = sharedName(*parent, parentIdentifier);
  for (const Value& info : *children->asArray()) {
    const Dictionary* properties = info.asDictionary();
    const AccountPtr child =
        properties != nullptr ? ASSBasicAccount::initWithProperties(*properties) : nullptr;
    // A record made from a dictionary without an identifier has a fresh one, which nobody stores:
    // the child could never be found or removed by it.
    const Value* identifier =
        properties != nullptr ? properties->find(kAccountIdentifier) : nullptr;
    const bool isNamed = identifier != nullptr && identifier->asString() != nullptr;
    if (!child || !isNamed || !parentName) {
      platform::logToSystem("Ignoring unknown child account with properties %@", info);
      continue;
    }
    child->setParentAccount(parent);
    _registerChild(*identifier, child, *parentName);
  }
}

// The tables share the texts of both identifiers: a small file may name a long one very often.
void ASSAccountsManager::_registerChild(const Value& identifier, const AccountPtr& child,
                                        const Value& parentIdentifier) {
  const propertylist::Text& childName = *identifier.asString();
  const propertylist::Text& parentName = *parentIdentifier.asString();
  std::optional<Value>& known = childAccountIDToParentAccountID_[childName];
  if (!known || *known->asString() != parentName) {  // else it is listed already
    childIDsByParentID_[parentName].push_back(identifier);
    known = std::nullopt;
  }
  childAccountsByID_.set(childName, child);
  known = parentIdentifier;
}

void ASSAccountsManager::_removeChildrenForAccountWithIdentifier(
    std::optional<std::string_view> identifier) {
  if (childIDsByParentID_.empty()) return;
  const std::vector<Value>* const children =
      identifier ? childIDsByParentID_.find(*identifier) : nullptr;
  if (children == nullptr) return;
  for (const Value& child : *children) {
    const propertylist::Text& name = *child.asString();
    const std::optional<Value>* const parent = childAccountIDToParentAccountID_.find(name);
    if (parent == nullptr || !*parent || *(*parent)->asString() != *identifier)
      continue;  // another parent's by now
    childAccountIDToParentAccountID_.remove(name);
    childAccountsByID_.remove(name);
  }
  childIDsByParentID_.remove(*identifier);
}

void ASSAccountsManager::_setOriginalAccountDictionaries() {
  IdentifierTable<Dictionary> originals;
  originals.reserve(orderedTopLevelAccounts_->size());
  for (const AccountPtr& account : *orderedTopLevelAccounts_) {
    if (const std::optional<propertylist::Text> identifier = account->identifier())
      originals.set(*identifier, account->propertiesToSave());
    else
      platform::logToSystem("%@ returned a nil identifier. Account properties may not get saved",
                            account);
  }
  originalAccountsByID_ = std::move(originals);
}

}  // namespace accountsettings
