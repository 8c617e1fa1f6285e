// Writing the accounts back, merged with what the file holds by now.

#include <new>
#include <utility>

#include "QuillnetAccountTypeRemoval/ASLog.h"
#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "QuillnetAccountTypeRemoval/SettingsFileWriting.h"
#include "platform/SystemLog.h"

namespace accountsettings {

using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

// Walks both dictionaries once instead of changing a copy key by key, so that the merge of accounts
// with very many keys stays linear.
Dictionary merged(const Dictionary& inMemory, const Dictionary& original,
                  const Dictionary& onDisk) {
  // What did not change on one side is what the other has.
  if (inMemory.sharesStorageWith(original)) return onDisk;
  if (onDisk.sharesStorageWith(original)) return inMemory;
  std::vector<Dictionary::Entry> entries;
  entries.reserve(onDisk.size() + inMemory.size());
  for (const Dictionary::Entry& disk : onDisk) {
    const Value* before = original.find(disk.key());
    const Value* now = inMemory.find(disk.key());
    if (now == nullptr && before != nullptr) continue;  // deleted in memory
    const bool changedInMemory = now != nullptr && (before == nullptr || *before != *now);
    entries.push_back(changedInMemory ? Dictionary::Entry(disk.key(), *now) : disk);
  }
  for (const Dictionary::Entry& now : inMemory) {
    if (onDisk.contains(now.key())) continue;
    const Value* before = original.find(now.key());
    const bool deletedOnDisk = before != nullptr && *before == now.value();
    if (!deletedOnDisk) entries.push_back(now);
  }
  return Dictionary(std::move(entries));
}

}  // namespace

Dictionary ASSAccountsManager::mergeInMemoryPropertiesOriginalPropertiesOnDiskProperties(
    const Dictionary& inMemory, const std::optional<Dictionary>& original,
    const std::optional<Dictionary>& onDisk) const {
  ASLog("Merging inmem %@ orig %@ onDisk %@", inMemory, original, onDisk);
  const bool nothingToMerge = !original || original->empty() || !onDisk || onDisk->empty();
  const Dictionary result = nothingToMerge ? inMemory : merged(inMemory, *original, *onDisk);
  ASLog("merged to %@", result);
  return result;
}

void ASSAccountsManager::_fixAccountsBeforeSaving(bool& fixedAny) {
  const AccountArray& accounts = *orderedTopLevelAccounts_;
  for (auto it = accounts.rbegin(); it != accounts.rend(); ++it) {
    for (const RuntimeFixerPtr& fixer : runtimeFixers_) {
      const FixVerdict verdict =
          fixer->fixBasicAccountIfNeededLoggingMessage(*it, "saving accounts");
      if (verdict != FixVerdict::nothingToDo) fixedAny = true;
      if (verdict != FixVerdict::couldNotFix) continue;
      // The account stays listed, so this save still writes it; the next load drops it.
      const std::optional<propertylist::Text> identifier = (*it)->identifier();
      _removeChildrenForAccountWithIdentifier(identifier);
      if (identifier) topLevelAccountsByID_.remove(*identifier);
    }
  }
}

Array ASSAccountsManager::_mergedAccounts(const std::vector<Dictionary>& inMemory,
                                          const ASSAccountsManager& onDisk) const {
  std::vector<Value> accounts;
  accounts.reserve(inMemory.size());
  for (const Dictionary& properties : inMemory) {
    const AccountPtr& account = (*orderedTopLevelAccounts_)[accounts.size()];
    const std::optional<propertylist::Text> identifier = account->identifier();
    const AccountPtr stored = identifier ? onDisk.accountWithIdentifier(*identifier) : nullptr;
    const Dictionary result = mergeInMemoryPropertiesOriginalPropertiesOnDiskProperties(
        properties, account->originalProperties(),
        stored ? std::optional(stored->propertiesToSave()) : std::nullopt);
    // The list is asked for whether or not tracing is on, and never printed.
    account->_askForEnabledNames();
    if (getASLoggingEnabled()) ASLog("%@:%@", account->type(), result);
    accounts.emplace_back(result);
  }
  return Array(std::move(accounts));
}

void ASSAccountsManager::saveAllAccounts() {
  ASLog("Saving all accounts");
  bool fixedAny = false;
  std::vector<Dictionary> inMemory;  // of each account in order
  bool saved = false;
  try {
    _fixAccountsBeforeSaving(fixedAny);
    // What another process wrote since this store was loaded.
    const AccountsManagerPtr onDisk = initInsideOfMigration();
    inMemory.reserve(orderedTopLevelAccounts_->size());
    for (const AccountPtr& account : *orderedTopLevelAccounts_)
      inMemory.push_back(account->propertiesToSave());
    const Dictionary root{{"Accounts", _mergedAccounts(inMemory, *onDisk)},
                          {"Version", currentVersion()}};
    // The file may be readable by now, with accounts that this store never saw.
    const bool holdsWhatNobodyRead = settingsFileIsUnreadable_ || onDisk->settingsFileIsUnreadable_;
    saved = writeSettingsFile(root, fullPathToAccountSettingsPlist(), holdsWhatNobodyRead);
  } catch (const std::bad_alloc&) {
    saved = false;  // as when any other thing that a save needs is missing
  }
  if (saved) {
    settingsFileIsUnreadable_ = false;
    // From here on, what is in memory counts as known to the file, also where the file kept values
    // of its own: they stay on disk and are not taken into memory. Nothing may fail any more, or
    // the next save would take what this one wrote for a change of its own.
    for (std::size_t i = 0; i < inMemory.size(); ++i)
      (*orderedTopLevelAccounts_)[i]->setOriginalProperties(std::move(inMemory[i]));
  } else {
    platform::logToSystem(
        "Failed to save accounts to filesystem. Maybe the information did not conform to a plist.");
  }
  if (fixedAny) {
    for (const RuntimeFixerPtr& fixer : runtimeFixers_) fixer->accountsHaveBeenSaved(true);
  }
  if (saved && !shouldSkipNotifications) {
    // The snapshot is renewed only when everybody has been told.
    _sendNotificationsForChangedAccounts();
    _setOriginalAccountDictionaries();
  }
}

}  // namespace accountsettings
