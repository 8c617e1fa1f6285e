// What older systems left behind, and running the device's accounts data migrator over it.

#include <cstdint>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "QuillnetAccountTypeRemoval/AccountsDataMigrator.h"
#include "QuillnetAccountTypeRemoval/Assertions.h"
#include "QuillnetAccountTypeRemoval/PropertyNumbers.h"
#include "platform/Services.h"

namespace accountsettings {

using propertylist::Dictionary;
using propertylist::Value;

namespace {

constexpr std::string_view kSourceFile = "ASSAccountsManager";

// Operators know the failures of this file by these lines.
constexpr int kNoMailFlagLine = 1112;
constexpr int kNoDAFlagLine = 1113;
constexpr int kNoNewAccountsFlagLine = 1114;

constexpr std::string_view kMigratorBundle =
    "/System/Library/DataClassMigrators/AccountMigrator.migrator";
constexpr std::string_view kMigratorClass = "AccountsDataMigrator";

std::string pathInHomeDirectory(std::string_view path) {
  return platform::joinedPath(platform::services().userDatabase.homeDirectory(), path);
}

// The number that log lines give for a flag: of its address, what fits into an int.
std::int32_t loggedAddress(const bool* flag) {
  return static_cast<std::int32_t>(
      static_cast<std::uint32_t>(reinterpret_cast<std::uintptr_t>(flag)));
}

void logFailure() {
  platform::logToSystem("[%s] Accounts migration failed",
                        "+[ASSAccountsManager _migrateAccountsIfNeeded]");
}

// Runs the migrator whose bundle is loaded.
void runMigrator() {
  platform::RuntimeClass* const found =
      platform::services().classRegistry.classNamed(kMigratorClass);
  auto* const migratorClass = dynamic_cast<AccountsDataMigratorClass*>(found);
  const std::unique_ptr<AccountsDataMigrator> migrator =
      migratorClass != nullptr ? migratorClass->init() : nullptr;
  if (migrator == nullptr || !migrator->executeMigrationSteps()) logFailure();
}

void runMigratorOfDevice() {
  const platform::Services& services = platform::services();
  const std::string path =
      platform::joinedPath(services.deviceInfo.systemRootDirectory(), kMigratorBundle);
  if (services.classRegistry.loadCodeBundle(path) != nullptr)
    runMigrator();
  else if (services.fileServices.fileExists(path))
    logFailure();  // a bundle that cannot be loaded is not a device without one
}

// The migration lock, given back when the block ends, also by an exception.
class HeldMigrationLock {
 public:
  HeldMigrationLock() : _lock(ASSAccountsManager::createAndLockMigrationLock()) {}
  ~HeldMigrationLock() {
    if (_lock) ASSAccountsManager::releaseMigrationLock(_lock);
  }
  HeldMigrationLock(const HeldMigrationLock&) = delete;
  HeldMigrationLock& operator=(const HeldMigrationLock&) = delete;
  bool isHeld() const { return _lock != nullptr; }

 private:
  platform::HeldFileLockPtr _lock;
};

}  // namespace

std::atomic<bool> ASSAccountsManager::migrationAttempted = false;

std::string mailAccountsPath() { return pathInHomeDirectory("Library/Mail/Accounts.plist"); }

std::string daAccountPath() {
  return pathInHomeDirectory("Library/Preferences/com.vantor.DataAccess.plist");
}

bool ASSAccountsManager::_oldMailAccountsInformationFound() {
  return platform::services().fileServices.fileExists(mailAccountsPath());
}

bool ASSAccountsManager::_oldDAAccountsInformationFound() {
  return platform::services().fileServices.fileExists(daAccountPath());
}

bool ASSAccountsManager::accountSettingsNeedsToBeMigrated() {
  const propertylist::FileReadResult read =
      platform::services().fileServices.readPropertyListFile(fullPathToAccountSettingsPlist());
  const Dictionary* const root = read.value ? read.value->asDictionary() : nullptr;
  if (root == nullptr) return false;
  const Value* const version = root->find("Version");
  if (version == nullptr) {
    platform::logToSystem(
        "Account Settings plist is missing a version number, returning NO for migration");
    return false;
  }
  const std::int64_t saved = integerValue(version);
  if (static_cast<std::uint64_t>(saved) >= currentVersion()) return false;
  platform::logToSystem(
      "Account Settings Version out of date: savedVersion=%ld, currentVersion=%ld", saved,
      currentVersion());
  return true;
}

void ASSAccountsManager::shouldMigrateOldMailAccountsOldDAAccountsNewAccountSettings(
    bool* migrateOldMailAccounts, bool* migrateOldDAAccounts, bool* migrateNewAccounts) {
  if (migrateOldMailAccounts == nullptr)
    raiseAssertionFailure(kSourceFile, kNoMailFlagLine, "migrateOldMailAccounts cannot be nil");
  if (migrateOldDAAccounts == nullptr)
    raiseAssertionFailure(kSourceFile, kNoDAFlagLine, "migrateOldDAAccounts cannot be nil");
  if (migrateNewAccounts == nullptr)
    raiseAssertionFailure(kSourceFile, kNoNewAccountsFlagLine, "migrateNewAccounts cannot be nil");
  const bool mail = _oldMailAccountsInformationFound();
  const bool da = _oldDAAccountsInformationFound();
  *migrateOldMailAccounts = mail;
  *migrateOldDAAccounts = da;
  *migrateNewAccounts = !mail && !da && accountSettingsNeedsToBeMigrated();
  if (!mail && !da && !*migrateNewAccounts) return;
  platform::logToSystem(
      "Accounts settings needs migration! oldMailAccountsPresent=%d, oldDAAccountsPresent=%d, "
      "migrateNewAccountsInfo=%d",
      mail, da, loggedAddress(migrateNewAccounts));
}

void ASSAccountsManager::removeNewAccountSettingsToMigrateOldAccountInformation() {
  platform::FileServices& files = platform::services().fileServices;
  const std::string path = fullPathToAccountSettingsPlist();
  if (!files.fileExists(path)) return;
  const platform::Status removed = files.removeFile(path);
  if (removed.isSuccess()) return;
  platform::logToSystem("[%s] Could not remove %@. Error %@",
                        "+[ASSAccountsManager(MigrationSupport) "
                        "removeNewAccountSettingsToMigrateOldAccountInformation]",
                        path, removed.error);
}

void ASSAccountsManager::_migrateAccountsIfNeeded() {
  // Not an exchange: two threads that come at once both go on, and decide again one after the
  // other, as two processes do.
  if (migrationAttempted) return;
  migrationAttempted = true;
  bool oldMailAccounts = false;
  bool oldDAAccounts = false;
  bool newAccounts = false;
  shouldMigrateOldMailAccountsOldDAAccountsNewAccountSettings(&oldMailAccounts, &oldDAAccounts,
                                                              &newAccounts);
  if (!oldMailAccounts && !oldDAAccounts && !newAccounts) return;
  const HeldMigrationLock lock;
  if (!lock.isHeld()) return;
  // Another process may have migrated while this one waited.
  shouldMigrateOldMailAccountsOldDAAccountsNewAccountSettings(&oldMailAccounts, &oldDAAccounts,
                                                              &newAccounts);
  if (oldMailAccounts || oldDAAccounts) removeNewAccountSettingsToMigrateOldAccountInformation();
  if (oldMailAccounts || oldDAAccounts || newAccounts) runMigratorOfDevice();
}

}  // namespace accountsettings
