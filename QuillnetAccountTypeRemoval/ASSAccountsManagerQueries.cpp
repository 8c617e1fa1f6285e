// Finding and listing accounts.

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "QuillnetAccountTypeRemoval/Assertions.h"
#include "platform/Services.h"

namespace accountsettings {
namespace {

template <typename Accounts>
AccountPtr firstWithSyncIdentifier(const Accounts& accountsByID, std::string_view syncIdentifier) {
  for (const auto& [identifier, account] : accountsByID) {
    if (account->syncStoreIdentifier() == syncIdentifier) return account;
  }
  return nullptr;
}

}  // namespace

AccountPtr ASSAccountsManager::accountWithIdentifier(std::string_view identifier) const {
  if (const AccountPtr* const found = topLevelAccountsByID_.find(identifier)) return *found;
  const AccountPtr* const child = childAccountsByID_.find(identifier);
  if (child == nullptr) return nullptr;
  // By the identifier that the child has now, which may have been changed since it was loaded.
  const std::optional<propertylist::Text> current = (*child)->identifier();
  if (!current) return nullptr;
  const std::optional<propertylist::Value>* const parent =
      childAccountIDToParentAccountID_.find(*current);
  if (parent == nullptr || !*parent) return nullptr;
  const AccountPtr* const found = topLevelAccountsByID_.find(*(*parent)->asString());
  return found != nullptr ? *found : nullptr;
}

AccountPtr ASSAccountsManager::syncableAccountWithSyncIdentifier(
    std::string_view syncIdentifier) const {
  if (AccountPtr account = firstWithSyncIdentifier(topLevelAccountsByID_, syncIdentifier))
    return account;
  return firstWithSyncIdentifier(childAccountsByID_, syncIdentifier);
}

AccountPtr ASSAccountsManager::displayAccountWithSyncIdentifier(
    std::string_view syncIdentifier) const {
  const AccountPtr account = syncableAccountWithSyncIdentifier(syncIdentifier);
  const auto identifier = account ? account->identifier() : std::nullopt;
  return identifier ? accountWithIdentifier(*identifier) : nullptr;
}

AccountArray ASSAccountsManager::allBasicSyncableAccounts() const {
  AccountArray accounts = *orderedTopLevelAccounts_;
  accounts.reserve(accounts.size() + childAccountsByID_.size());
  for (const auto& [identifier, child] : childAccountsByID_) accounts.push_back(child);
  return accounts;
}

AccountArray ASSAccountsManager::basicAccountsWithTypes(const StringList& types) const {
  AccountArray accounts;
  for (const AccountPtr& account : *orderedTopLevelAccounts_) {
    if (isOfOneType(*account, types)) accounts.push_back(account);
  }
  return accounts;
}

std::size_t ASSAccountsManager::countOfBasicAccountsWithTypes(const StringList& types) const {
  return basicAccountsWithTypes(types).size();
}

DeviceLocalAccountPtr ASSAccountsManager::fullDeviceLocalAccount() {
  for (const AccountPtr& account : *orderedTopLevelAccounts_) {
    if (account->type() != kOnMyDeviceAccountType) continue;
    if (auto local = std::dynamic_pointer_cast<ASSDeviceLocalAccount>(account)) return local;
  }
  platform::logToSystem("DeviceLocalAccount missing. Creating...");
  const DeviceLocalAccountPtr created =
      ASSDeviceLocalAccount::initWithProperties(ASSDeviceLocalAccount::basicAccountProperties());
  if (!created)
    raiseAssertionFailure("ASSAccountsManager", __LINE__, "The account type (%@) is not supported",
                          kOnMyDeviceAccountType);
  replaceAccountsWithTypesWithAccounts({std::string(kOnMyDeviceAccountType)}, {created});
  return created;
}

FullAccountPtr ASSAccountsManager::fullAccountWithIdentifierLoader(std::string_view identifier,
                                                                   FullAccountLoader* loader) {
  if (identifier.empty()) return nullptr;
  const AccountPtr* found = topLevelAccountsByID_.find(identifier);
  if (found == nullptr) found = childAccountsByID_.find(identifier);
  if (found == nullptr) return nullptr;
  const AccountPtr account = *found;  // which the loader may delete
  return account->fullAccountUsingLoader(loader);
}

std::vector<FullAccountPtr> ASSAccountsManager::accountsWithTypes(const StringList& types) {
  return accountsWithTypesWithLoader(types, nullptr);
}

std::vector<FullAccountPtr> ASSAccountsManager::accountsWithTypesWithLoader(
    const StringList& types, FullAccountLoader* loader) {
  // The children of each parent object, so that they are not walked once for every parent.
  std::unordered_map<const ASSBasicAccount*, StringList> matchingChildren;
  for (const auto& [identifier, child] : childAccountsByID_) {
    if (isOfOneType(*child, types))
      matchingChildren[child->parentAccount().get()].emplace_back(identifier);
  }
  std::vector<FullAccountPtr> accounts;
  const AccountArray listed = *orderedTopLevelAccounts_;  // which the loader may change
  for (const AccountPtr& account : listed) {
    if (isOfOneType(*account, types)) {
      FullAccountPtr full =
          fullAccountWithIdentifierLoader(account->identifier().value_or(""), loader);
      // Listed without being registered by its identifier: never skipped silently.
      if (!full)
        raiseAssertionFailure("ASSAccountsManager", __LINE__, "%@ has no full account", account);
      accounts.push_back(std::move(full));
    }
    const auto children = matchingChildren.find(account.get());
    if (children == matchingChildren.end()) continue;
    for (const std::string& identifier : children->second) {
      if (FullAccountPtr full = fullAccountWithIdentifierLoader(identifier, loader))
        accounts.push_back(std::move(full));
    }
  }
  return accounts;
}

std::vector<FullAccountPtr> ASSAccountsManager::allMailAccounts() {
  return accountsWithTypes({std::string(kMailAccountType), std::string(kQuillnetAccountType),
                            std::string(kGmailAccountType), std::string(kYahooAccountType)});
}

}  // namespace accountsettings
