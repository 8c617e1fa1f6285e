#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"
#include "QuillnetAccountTypeRemoval/ASSDeviceLocalAccount.h"
#include "QuillnetAccountTypeRemoval/ASSRuntimeFixMailAccount.h"
#include "QuillnetAccountTypeRemoval/AccountChanges.h"
#include "QuillnetAccountTypeRemoval/IdentifierTable.h"
#include "QuillnetAccountTypeRemoval/StringLists.h"
#include "platform/ExclusiveFileLock.h"
#include "propertylist/Value.h"

namespace accountsettings {

class ASSAccountsManager;
using AccountsManagerPtr = std::shared_ptr<ASSAccountsManager>;
using AccountArray = std::vector<AccountPtr>;

// The accounts of one device: read from the settings file when the store is made, changed in
// memory, written back by saveAllAccounts. Every user makes a store of its own; two stores, in one
// process or in two, meet only in the file, where a save merges what both changed.
//
// Top-level accounts have an order, that of the file. The child accounts of a top-level account are
// dictionaries in its property "ChildAccounts", one level deep; their records are made from there
// and are an index of it. Identifiers are expected to be unique and not forced to be.
//
// The store shares its records with its callers: a change of a record is a change of the store. One
// thread at a time; no lock is taken. What fails is logged, not returned.
class ASSAccountsManager {
 public:
  virtual ~ASSAccountsManager() = default;
  ASSAccountsManager(const ASSAccountsManager&) = delete;
  ASSAccountsManager& operator=(const ASSAccountsManager&) = delete;

  // --- Making a store ---

  // Reads the settings file, once. A file that is missing, or cannot be read as a dictionary, gives
  // an empty store without a word. Both do the same.
  static AccountsManagerPtr init();
  static AccountsManagerPtr initInsideOfMigration();
  // A store of the given account dictionaries; the file is not read and dataVersion stays 0.
  static AccountsManagerPtr initWithAccounsInfoArray(
      const std::optional<propertylist::Array>& accounts);

  // The "Version" of the file that was read; 0 when it had none. A save writes currentVersion
  // whatever stands here.
  std::int64_t dataVersion() const { return dataVersion_; }
  void setDataVersion(std::int64_t version) { dataVersion_ = version; }
  static unsigned currentVersion() { return 12; }
  static std::string fullPathToAccountSettingsPlist();

  // --- Queries: nothing is changed or written; an unknown identifier gives null ---

  // The top-level account with the identifier; for the identifier of a child, its top-level parent.
  AccountPtr accountWithIdentifier(std::string_view identifier) const;
  // The account, child accounts included, whose sync store has the identifier. A top-level account
  // wins.
  AccountPtr syncableAccountWithSyncIdentifier(std::string_view syncIdentifier) const;
  // The same account, or for a child its parent: the one that is shown to the user.
  AccountPtr displayAccountWithSyncIdentifier(std::string_view syncIdentifier) const;
  // The top-level accounts in order. Live: insertions and deletions show in an array taken earlier;
  // the replace operations install another array, and one taken before keeps showing what was.
  std::shared_ptr<const AccountArray> allBasicAccounts() const { return orderedTopLevelAccounts_; }
  // The top-level accounts in order, then all child accounts.
  AccountArray allBasicSyncableAccounts() const;
  AccountArray basicAccountsWithTypes(const StringList& types) const;
  std::size_t countOfBasicAccountsWithTypes(const StringList& types) const;
  std::size_t count() const { return orderedTopLevelAccounts_->size(); }
  // The device-local account. A store without one gets a new one, with a log line; it reaches the
  // file at the next save. A plain record of type "OnMyDevice" does not count and is replaced or
  // removed. (The store's own record, whatever the name says; no full account is made.)
  DeviceLocalAccountPtr fullDeviceLocalAccount();
  // The full account of the top-level or child account with the identifier (see
  // ASSBasicAccount::fullAccountUsingLoader); null for an empty or unknown identifier.
  FullAccountPtr fullAccountWithIdentifierLoader(std::string_view identifier,
                                                 FullAccountLoader* loader);
  // The full accounts of these types: every top-level account's, followed by its children's, which
  // are listed whatever their parent's type. A child without one is left out.
  std::vector<FullAccountPtr> accountsWithTypes(const StringList& types);
  std::vector<FullAccountPtr> accountsWithTypesWithLoader(const StringList& types,
                                                          FullAccountLoader* loader);
  std::vector<FullAccountPtr> allMailAccounts();

  // --- Changes in memory: the file changes at the next save ---

  // Puts `account` in place of every account with its identifier, and does nothing when there is
  // none.
  void updateAccount(const AccountPtr& account);
  // Appends `account`, unless a top-level account with its identifier is registered.
  void insertAccount(const AccountPtr& account);
  // Removes the last account that has the identifier of `account`, which need not be the same
  // object, and its children. Of two different accounts with one identifier the first stays listed.
  // Looks through the list from its end, because an account's identifier may have been changed
  // since: whoever deletes very many does so from the end, or in one call of the replacement below.
  void deleteAccount(const AccountPtr& account);
  // Deletes the top-level account with the identifier; nothing when there is none.
  void deleteAccountWithIdentifier(std::string_view identifier);
  // Puts `replacement` where `current` stands, which must be the very object the store holds; any
  // other is a caller error and changes nothing. Until the file is loaded again
  // accountWithIdentifier does not find `replacement` among the top-level accounts; updateAccount
  // has no such gap.
  void replaceAccountWithAccount(const AccountPtr& current, const AccountPtr& replacement);
  // Makes `accounts` the accounts of these types. One with the identifier property of an account of
  // the store takes its place, whatever that one's type; other accounts of the types go, with their
  // children; the rest of `accounts` is appended in order, and one that has a parent is put into
  // that parent's children instead, out of its old parent's. A child whose parent is neither kept
  // nor placed before it is a caller error and changes nothing.
  void replaceAccountsWithTypesWithAccounts(const StringList& types, const AccountArray& accounts);
  // Removes the child's dictionary from the parent's "ChildAccounts".
  void removeChildWithIdentifierFromAccount(std::string_view identifier, const AccountPtr& parent);
  // Appends the child's own properties to the parent's "ChildAccounts", whether or not a child of
  // that identifier is there. The store's record of the child is a new one.
  void addChildToAccount(const AccountPtr& child, const AccountPtr& parent);

  // --- Saving ---

  // Writes every account, merged with what the file holds by now, in one step: a reader sees the
  // old or the new file. When anything fails the file stays as it is, one line is logged and
  // nothing is returned. Accounts that another process added meanwhile are not carried over.
  // When memory runs out after the new file is in place, while others are told of the changes, that
  // is thrown; the records know then that they were saved.
  //
  // A file that cannot be read now, or could not be when this store was made from it, is kept under
  // another name beside it (FileServices::setAsideUnreadableFile); where that fails, so does the
  // save. Each account is merged with what accountWithIdentifier answers for its identifier in a
  // store of the file: of several accounts with one identifier each is written, and each merged
  // with the last one in the file; an identifier that is a child's there gives the child's parent.
  void saveAllAccounts();
  // One account's properties out of three versions: what changed in memory since `original` wins,
  // key by key, and what did not change follows `onDisk`. Without `original` or `onDisk`, absent or
  // empty, the answer is `inMemory`. Values are taken whole, never merged inside.
  propertylist::Dictionary mergeInMemoryPropertiesOriginalPropertiesOnDiskProperties(
      const propertylist::Dictionary& inMemory,
      const std::optional<propertylist::Dictionary>& original,
      const std::optional<propertylist::Dictionary>& onDisk) const;

  // --- Change notifications ---
  //
  // Notifier classes live in code bundles that the catalogue of account creators names for a type.
  // They are looked up, and their bundles loaded, at every call. A malformed catalogue, a bundle
  // that does not load and a class that is not there are InternalConsistencyFailures.

  // Tell the notifiers of the account's type and the dataclass, whatever the skip flag says. A
  // class that does not listen is passed over.
  static void accountWillChangeForDataclass(const AccountPtr& account, std::string_view dataclass);
  static void accountDidChangeForDataclass(const AccountPtr& account, std::string_view dataclass);
  // Whether saves of this copy of the library tell the notifiers nothing; true until somebody says
  // otherwise. A program and each plug-in in its process that holds the library has a copy, and a
  // flag, of its own.
  // What is skipped is told by the first save after the flag is cleared.
  static void _setShouldSkipNotifications(bool skip);
  // How a list of accounts of the type is headed; empty but for subscribed calendars.
  static std::optional<std::string> displayNameForGroupOfAccountTypeForBeginningOfSentence(
      std::string_view type, bool beginningOfSentence);

  // --- Migration support: keeping other processes out, and what older systems left behind ---
  //
  // Class operations for clients that migrate, back up or restore account data. Making, changing
  // and saving a store calls none of them. They work on the calling thread and may take long.

  // Waits, however long, until this process holds the system's migration lock; null when the lock
  // cannot be made. The holder gives it back through releaseMigrationLock; the system frees it when
  // the process ends. The file behind it, kAccountMigrationLockFilename, is never removed.
  static platform::HeldFileLockPtr createAndLockMigrationLock();
  static void releaseMigrationLock(const platform::HeldFileLockPtr& lock);
  // Returns when nobody holds the migration lock, or it cannot be made; holds nothing afterwards.
  static void waitForMigrationToFinish();
  // Has the data-access daemon leave: asks it, waits for five seconds, kills it, waits for five
  // more, and goes on in any case; the log tells how far it came. The calling thread's run loop
  // runs meanwhile. Does nothing, and says nothing, when the daemon does not run or is the caller.
  // The daemon is gone as soon as its name leads to another process; whoever has the name when the
  // time is up gets the signal.
  static void killDataAccessIfNecessary();

  // Whether accounts of an older system lie in its mail accounts file (data-access preferences).
  static bool _oldMailAccountsInformationFound();
  static bool _oldDAAccountsInformationFound();
  // Whether the settings file's version is older than currentVersion. A file that is missing, is
  // unreadable or has no version is none to migrate; versions compare as unsigned numbers, so a
  // negative one is newer than any.
  static bool accountSettingsNeedsToBeMigrated();
  // What there is to migrate, written to all three flags. With legacy files the settings file's
  // version is not looked at, since the file will be built anew. No flag may be null
  // (InternalConsistencyFailure). The log line's third number is the low half of the third flag's
  // address; readers of old logs expect it there.
  static void shouldMigrateOldMailAccountsOldDAAccountsNewAccountSettings(
      bool* migrateOldMailAccounts, bool* migrateOldDAAccounts, bool* migrateNewAccounts);
  // Removes the settings file, so that it is built from the legacy files. A failure is logged.
  static void removeNewAccountSettingsToMigrateOldAccountInformation();
  // Runs the device's accounts data migrator, under the migration lock, when there is something to
  // migrate: once per process (where several copies of this library are loaded, once per copy),
  // whatever comes of it. Without that migrator's bundle nothing is
  // said, and a removed settings file stays removed. The legacy files are not touched, so each
  // process that calls this while they are there has the settings built anew from them, and what
  // was changed since is gone: a device calls it once, after an upgrade, or its migrator moves the
  // files away.
  static void _migrateAccountsIfNeeded();

 protected:
  // Change records by the name of the notifier class that is to hear of them.
  using NotificationTable = std::map<std::string, propertylist::Array>;

  static StringList _notifierClassNamesForAccountTypeDataclass(
      const std::optional<std::string>& type, std::string_view dataclass);
  // Adds a record for every notifier that serves a dataclass which the change affects: one for
  // each, however many dataclasses it serves. Compares what is stored, not what is provisioned or
  // allowed.
  void _addNotificationToDictionaryForChangeTypeOriginalPropertiesCurrentProperties(
      NotificationTable& table, AccountChangeType change,
      const std::optional<propertylist::Dictionary>& original,
      const std::optional<propertylist::Dictionary>& current) const;
  // Tells every notifier what changed since the snapshot. An account that is listed but not
  // registered by its identifier counts as deleted.
  void _sendNotificationsForChangedAccounts() const;

  // Makes an object without accounts; _initFromSettingsFile or _initWithAccountsInfo completes it.
  ASSAccountsManager();
  void _initFromSettingsFile();
  void _initWithAccountsInfo(const std::optional<propertylist::Array>& accounts);
  // The fixers through which every top-level account passes at loading and saving. A subclass may
  // choose others.
  virtual std::vector<RuntimeFixerPtr> _createRuntimeFixers();

  void _loadChildrenFromAccount(const AccountPtr& parent);
  void _removeChildrenForAccountWithIdentifier(std::optional<std::string_view> identifier);
  // Takes the snapshot of what was loaded or saved, which change notifications compare with.
  void _setOriginalAccountDictionaries();

  const IdentifierTable<propertylist::Dictionary>& originalAccountsByID() const {
    return originalAccountsByID_;
  }
  const IdentifierTable<AccountPtr>& childAccountsByID() const { return childAccountsByID_; }
  // Each a string.
  const IdentifierTable<std::optional<propertylist::Value>>& childAccountIDToParentAccountID()
      const {
    return childAccountIDToParentAccountID_;
  }

 private:
  using AccountsByID = IdentifierTable<AccountPtr>;

  static std::atomic<bool> shouldSkipNotifications;
  static std::atomic<bool> migrationAttempted;

  void _loadAccount(const propertylist::Value& info, bool& fixedAny);
  void _register(const AccountPtr& account);
  void _loadChildren(const AccountPtr& parent,
                     const std::optional<propertylist::Text>& parentIdentifier);
  void _registerChild(const propertylist::Value& identifier, const AccountPtr& child,
                      const propertylist::Value& parentIdentifier);
  bool _everyChildHasItsParent(const StringList& types, const AccountArray& accounts) const;
  void _placeChild(const AccountPtr& child, const AccountsByID& placed);
  void _fixAccountsBeforeSaving(bool& fixedAny);
  // `inMemory` has the properties to save of every top-level account, in order.
  propertylist::Array _mergedAccounts(const std::vector<propertylist::Dictionary>& inMemory,
                                      const ASSAccountsManager& onDisk) const;

  // Every account in the order of the list, as it was registered; an account placed by
  // replaceAccountWithAccount is listed here and not registered by its identifier.
  AccountsByID topLevelAccountsByID_;
  std::shared_ptr<AccountArray> orderedTopLevelAccounts_;
  // Until a caller chose what is listed, each record is listed once, and a deletion need not look
  // for more of it.
  bool mayListOneTwice_ = false;
  AccountsByID childAccountsByID_;
  IdentifierTable<std::optional<propertylist::Value>> childAccountIDToParentAccountID_;
  // The identifiers of one parent's children, so that they are found without a walk over all. One
  // that has gone to another parent since is listed too, and twice when it has come back.
  IdentifierTable<std::vector<propertylist::Value>> childIDsByParentID_;
  IdentifierTable<propertylist::Dictionary> originalAccountsByID_;
  std::int64_t dataVersion_ = 0;
  std::vector<RuntimeFixerPtr> runtimeFixers_;
  // The file existed and could not be read as a dictionary when this store was made from it. What
  // it held is then neither in memory nor known to have been empty, until a save has replaced it.
  bool settingsFileIsUnreadable_ = false;
};

// The path of the settings file, for callers outside the store.
std::string accountSettingsAccountsPath();

// Where older systems kept mail accounts and data-access accounts, below the user's home directory.
std::string mailAccountsPath();
std::string daAccountPath();

}  // namespace accountsettings
