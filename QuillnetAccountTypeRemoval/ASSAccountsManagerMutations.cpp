// Changing the accounts in memory.

#include <algorithm>
#include <unordered_set>

#include "QuillnetAccountTypeRemoval/ASLog.h"
#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"

namespace accountsettings {

using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

// The property "Identifier", which for the device-local account is not what `identifier` answers.
std::optional<std::string> identifierProperty(const AccountPtr& account) {
  const Value* value = account->accountPropertyForKey(kAccountIdentifier);
  const std::string* identifier = value != nullptr ? value->asString() : nullptr;
  return identifier != nullptr ? std::optional(*identifier) : std::nullopt;
}

const Array* childrenOf(const AccountPtr& parent) {
  const Value* children = parent->accountPropertyForKey(kAccountChildAccounts);
  return children != nullptr ? children->asArray() : nullptr;
}

std::map<std::string, AccountPtr> byIdentifierProperty(const AccountArray& accounts) {
  std::map<std::string, AccountPtr> result;
  for (const AccountPtr& account : accounts) {
    if (const std::optional<std::string> identifier = identifierProperty(account))
      result[*identifier] = account;
  }
  return result;
}

}  // namespace

void ASSAccountsManager::updateAccount(const AccountPtr& account) {
  ASLog("Updating account:%@", account->properties());
  const std::optional<std::string> identifier = account->identifier();
  if (!identifier) return;
  AccountArray& accounts = *orderedTopLevelAccounts_;
  for (auto place = accounts.rbegin(); place != accounts.rend(); ++place) {
    if ((*place)->identifier() != identifier) continue;
    *place = account;
    topLevelAccountsByID_[*identifier] = account;
    _loadChildrenFromAccount(account);
  }
}

void ASSAccountsManager::insertAccount(const AccountPtr& account) {
  ASLog("Inserting account:", account->properties());
  const std::optional<std::string> identifier = account->identifier();
  if (identifier && topLevelAccountsByID_.contains(*identifier)) return;
  // A copy, because the caller's may be an element of the very array that it is appended to.
  _register(AccountPtr(account));
}

void ASSAccountsManager::deleteAccount(const AccountPtr& account) {
  ASLog("Deleting account:", account->properties());
  const std::optional<std::string> identifier = account->identifier();
  if (!identifier) return;
  _removeChildrenForAccountWithIdentifier(identifier);
  topLevelAccountsByID_.erase(*identifier);
  AccountArray& accounts = *orderedTopLevelAccounts_;
  const auto last = std::find_if(accounts.rbegin(), accounts.rend(), [&](const AccountPtr& stored) {
    return stored->identifier() == identifier;
  });
  if (last == accounts.rend()) return;
  const AccountPtr found = *last;
  std::erase(accounts, found);
}

void ASSAccountsManager::deleteAccountWithIdentifier(std::string_view identifier) {
  const auto found = topLevelAccountsByID_.find(identifier);
  if (found == topLevelAccountsByID_.end()) return;
  const AccountPtr account = found->second;
  deleteAccount(account);
}

void ASSAccountsManager::replaceAccountWithAccount(const AccountPtr& current,
                                                   const AccountPtr& replacement) {
  auto accounts = std::make_shared<AccountArray>(*orderedTopLevelAccounts_);
  const auto place = std::find(accounts->begin(), accounts->end(), current);
  if (place == accounts->end()) return;
  const std::optional<std::string> identifier = current->identifier();
  _removeChildrenForAccountWithIdentifier(identifier);
  if (identifier) topLevelAccountsByID_.erase(*identifier);
  *place = replacement;
  _loadChildrenFromAccount(replacement);
  orderedTopLevelAccounts_ = std::move(accounts);
}

bool ASSAccountsManager::_everyChildHasItsParent(const StringList& types,
                                                 const AccountArray& accounts) const {
  const std::map<std::string, AccountPtr> replacements = byIdentifierProperty(accounts);
  std::set<std::string> placed;
  std::unordered_set<AccountPtr> replacing;
  for (const AccountPtr& stored : *orderedTopLevelAccounts_) {
    const std::optional<std::string> identifier = identifierProperty(stored);
    if (!identifier) continue;
    const auto replacement = replacements.find(*identifier);
    if (replacement != replacements.end()) replacing.insert(replacement->second);
    if (replacement != replacements.end() || !isOfOneType(*stored, types))
      placed.insert(*identifier);
  }
  for (const AccountPtr& account : accounts) {
    if (replacing.contains(account)) continue;
    if (const std::optional<std::string> parent = account->parentAccountIdentifier()) {
      if (!placed.contains(*parent)) return false;
    } else if (const std::optional<std::string> identifier = identifierProperty(account)) {
      placed.insert(*identifier);
    }
  }
  return true;
}

void ASSAccountsManager::replaceAccountsWithTypesWithAccounts(const StringList& types,
                                                              const AccountArray& accounts) {
  ASLog("Replacing accounts");
  if (!_everyChildHasItsParent(types, accounts)) return;
  const std::map<std::string, AccountPtr> replacements = byIdentifierProperty(accounts);
  AccountsByID placed;
  std::unordered_set<AccountPtr> replacing;
  auto remaining = std::make_shared<AccountArray>();  // last account first, until the walk is over

  // From the last to the first, so that of two kept accounts with one identifier the first ends up
  // registered.
  const AccountArray& stored = *orderedTopLevelAccounts_;
  for (auto it = stored.rbegin(); it != stored.rend(); ++it) {
    const std::optional<std::string> identifier = identifierProperty(*it);
    const auto replacement = identifier ? replacements.find(*identifier) : replacements.end();
    if (replacement != replacements.end()) {
      remaining->push_back(replacement->second);
      placed[*identifier] = replacement->second;
      replacing.insert(replacement->second);
      _loadChildrenFromAccount(replacement->second);
    } else if (!isOfOneType(**it, types)) {
      remaining->push_back(*it);
      if (identifier) placed[*identifier] = *it;
    } else {
      _removeChildrenForAccountWithIdentifier(identifier);
    }
  }
  std::reverse(remaining->begin(), remaining->end());

  for (const AccountPtr& account : accounts) {
    if (replacing.contains(account)) continue;
    if (account->parentAccountIdentifier()) {
      _placeChild(account, placed);
      continue;
    }
    remaining->push_back(account);
    if (const std::optional<std::string> identifier = identifierProperty(account))
      placed[*identifier] = account;
    _loadChildrenFromAccount(account);
  }
  orderedTopLevelAccounts_ = std::move(remaining);
  topLevelAccountsByID_ = std::move(placed);
}

// Takes the child out of the parent under which the store knows it, as the store still stands, and
// puts it into its own parent: a child that stays is replaced rather than doubled.
void ASSAccountsManager::_placeChild(const AccountPtr& child, const AccountsByID& placed) {
  const AccountPtr parent = placed.at(*child->parentAccountIdentifier());
  if (const std::optional<std::string> identifier = child->identifier()) {
    const auto known = childAccountIDToParentAccountID_.find(*identifier);
    if (known != childAccountIDToParentAccountID_.end()) {
      const AccountPtr oldParent =
          parent->identifier() == known->second ? parent : accountWithIdentifier(known->second);
      if (oldParent) removeChildWithIdentifierFromAccount(*identifier, oldParent);
    }
  }
  addChildToAccount(child, parent);
}

void ASSAccountsManager::removeChildWithIdentifierFromAccount(std::string_view identifier,
                                                              const AccountPtr& parent) {
  const Array* children = childrenOf(parent);
  std::vector<Value> kept;
  if (children != nullptr) {
    for (const Value& info : *children) {
      const Dictionary* properties = info.asDictionary();
      const AccountPtr child =
          properties != nullptr ? ASSBasicAccount::initWithProperties(*properties) : nullptr;
      if (!child || child->identifier() != identifier) kept.push_back(info);
    }
  }
  parent->setAccountPropertyForKey(
      children != nullptr ? std::optional<Value>(Array(std::move(kept))) : std::nullopt,
      kAccountChildAccounts);
  _loadChildrenFromAccount(parent);
}

void ASSAccountsManager::addChildToAccount(const AccountPtr& child, const AccountPtr& parent) {
  const Array* current = childrenOf(parent);
  Array children = current != nullptr ? *current : Array();
  children.append(child->properties());
  parent->setAccountPropertyForKey(std::move(children), kAccountChildAccounts);
  _loadChildrenFromAccount(parent);
}

}  // namespace accountsettings
