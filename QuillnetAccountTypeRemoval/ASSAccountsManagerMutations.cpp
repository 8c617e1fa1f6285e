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
std::optional<propertylist::Text> identifierProperty(const AccountPtr& account) {
  const Value* value = account->accountPropertyForKey(kAccountIdentifier);
  const propertylist::Text* identifier = value != nullptr ? value->asString() : nullptr;
  return identifier != nullptr ? std::optional(*identifier) : std::nullopt;
}

const Array* childrenOf(const AccountPtr& parent) {
  const Value* children = parent->accountPropertyForKey(kAccountChildAccounts);
  return children != nullptr ? children->asArray() : nullptr;
}

IdentifierTable<AccountPtr> byIdentifierProperty(const AccountArray& accounts) {
  IdentifierTable<AccountPtr> result;
  for (const AccountPtr& account : accounts) {
    if (const std::optional<propertylist::Text> identifier = identifierProperty(account))
      result.set(*identifier, account);
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
    mayListOneTwice_ = true;
    topLevelAccountsByID_.set(*identifier, account);
    _loadChildrenFromAccount(account);
  }
}

void ASSAccountsManager::insertAccount(const AccountPtr& account) {
  ASLog("Inserting account:", account->properties());
  const std::optional<propertylist::Text> identifier = account->identifier();
  if (identifier && topLevelAccountsByID_.contains(*identifier)) return;
  mayListOneTwice_ = true;
  // A copy, because the caller's may be an element of the very array that it is appended to.
  _register(AccountPtr(account));
}

void ASSAccountsManager::deleteAccount(const AccountPtr& account) {
  ASLog("Deleting account:", account->properties());
  const std::optional<std::string> identifier = account->identifier();
  if (!identifier) return;
  _removeChildrenForAccountWithIdentifier(identifier);
  topLevelAccountsByID_.remove(*identifier);
  AccountArray& accounts = *orderedTopLevelAccounts_;
  const auto last = std::find_if(accounts.rbegin(), accounts.rend(), [&](const AccountPtr& stored) {
    return stored->identifier() == identifier;
  });
  if (last == accounts.rend()) return;
  if (mayListOneTwice_) {
    const AccountPtr found = *last;
    std::erase(accounts, found);
  } else {
    accounts.erase(std::next(last).base());
  }
}

void ASSAccountsManager::deleteAccountWithIdentifier(std::string_view identifier) {
  const AccountPtr* const found = topLevelAccountsByID_.find(identifier);
  if (found == nullptr) return;
  const AccountPtr account = *found;
  deleteAccount(account);
}

void ASSAccountsManager::replaceAccountWithAccount(const AccountPtr& current,
                                                   const AccountPtr& replacement) {
  auto accounts = std::make_shared<AccountArray>(*orderedTopLevelAccounts_);
  const auto place = std::find(accounts->begin(), accounts->end(), current);
  if (place == accounts->end()) return;
  const std::optional<std::string> identifier = current->identifier();
  _removeChildrenForAccountWithIdentifier(identifier);
  if (identifier) topLevelAccountsByID_.remove(*identifier);
  *place = replacement;
  mayListOneTwice_ = true;
  _loadChildrenFromAccount(replacement);
  orderedTopLevelAccounts_ = std::move(accounts);
}

bool ASSAccountsManager::_everyChildHasItsParent(const StringList& types,
                                                 const AccountArray& accounts) const {
  const IdentifierTable<AccountPtr> replacements = byIdentifierProperty(accounts);
  IdentifierTable<bool> placed;
  std::unordered_set<AccountPtr> replacing;
  for (const AccountPtr& stored : *orderedTopLevelAccounts_) {
    const std::optional<propertylist::Text> identifier = identifierProperty(stored);
    if (!identifier) continue;
    const AccountPtr* const replacement = replacements.find(*identifier);
    if (replacement != nullptr) replacing.insert(*replacement);
    if (replacement != nullptr || !isOfOneType(*stored, types)) placed.set(*identifier, true);
  }
  for (const AccountPtr& account : accounts) {
    if (replacing.contains(account)) continue;
    if (const std::optional<propertylist::Text> parent = account->parentAccountIdentifier()) {
      if (!placed.contains(*parent)) return false;
    } else if (const std::optional<propertylist::Text> identifier = identifierProperty(account)) {
      placed.set(*identifier, true);
    }
  }
  return true;
}

void ASSAccountsManager::replaceAccountsWithTypesWithAccounts(const StringList& types,
                                                              const AccountArray& accounts) {
  ASLog("Replacing accounts");
  if (!_everyChildHasItsParent(types, accounts)) return;
  const IdentifierTable<AccountPtr> replacements = byIdentifierProperty(accounts);
  std::unordered_set<AccountPtr> replacing;
  auto remaining = std::make_shared<AccountArray>();  // last account first, until the walk is over
  const AccountArray& stored = *orderedTopLevelAccounts_;
  for (auto it = stored.rbegin(); it != stored.rend(); ++it) {
    const std::optional<propertylist::Text> identifier = identifierProperty(*it);
    const AccountPtr* const replacement = identifier ? replacements.find(*identifier) : nullptr;
    if (replacement != nullptr) {
      remaining->push_back(*replacement);
      replacing.insert(*replacement);
      _loadChildrenFromAccount(*replacement);
    } else if (!isOfOneType(**it, types)) {
      remaining->push_back(*it);
    } else {
      _removeChildrenForAccountWithIdentifier(identifier);
    }
  }
  std::reverse(remaining->begin(), remaining->end());

  // Of two kept accounts with one identifier the first is registered.
  AccountsByID placed;
  placed.reserve(remaining->size());
  for (const AccountPtr& account : *remaining) {
    const std::optional<propertylist::Text> identifier = identifierProperty(account);
    if (identifier && !placed.contains(*identifier)) placed.set(*identifier, account);
  }

  for (const AccountPtr& account : accounts) {
    if (replacing.contains(account)) continue;
    if (account->parentAccountIdentifier()) {
      _placeChild(account, placed);
      continue;
    }
    remaining->push_back(account);
    if (const std::optional<propertylist::Text> identifier = identifierProperty(account))
      placed.set(*identifier, account);
    _loadChildrenFromAccount(account);
  }
  mayListOneTwice_ = true;
  orderedTopLevelAccounts_ = std::move(remaining);
  topLevelAccountsByID_ = std::move(placed);
}

// Takes the child out of the parent under which the store knows it, as the store still stands, and
// puts it into its own parent: a child that stays is replaced rather than doubled.
void ASSAccountsManager::_placeChild(const AccountPtr& child, const AccountsByID& placed) {
  const AccountPtr parent = placed.at(*child->parentAccountIdentifier());
  if (const std::optional<std::string> identifier = child->identifier()) {
    const std::optional<Value>* const known = childAccountIDToParentAccountID_.find(*identifier);
    if (known != nullptr && *known) {
      const propertylist::Text& knownParent = *(*known)->asString();
      const AccountPtr oldParent =
          parent->identifier() == knownParent ? parent : accountWithIdentifier(knownParent);
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
