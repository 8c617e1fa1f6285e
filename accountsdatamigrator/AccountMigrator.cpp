// The bundle's class: builds the settings file anew from legacy files, or brings an older one up to
// date. docs/legacy-settings.md tells what becomes of what.
#include <memory>
#include <string>

#include "QuillnetAccountTypeRemoval/AccountsDataMigrator.h"
#include "QuillnetAccountTypeRemoval/SettingsFileWriting.h"
#include "accountsdatamigrator/AccountTypes.h"
#include "accountsdatamigrator/LegacyAccounts.h"
#include "accountsdatamigrator/OlderSettings.h"
#include "platform/Services.h"

namespace accountsdatamigrator {
namespace {

using propertylist::Array;
using propertylist::Dictionary;

std::string pathAtHome(std::string_view path) {
  return platform::joinedPath(platform::services().userDatabase.homeDirectory(), path);
}

// The library looks for the settings below the system's root, wherever the home directory is.
std::string settingsFile() {
  return platform::joinedPath(platform::services().deviceInfo.systemRootDirectory(),
                              "/var/mobile/Library/Preferences/com.vantor.accountsettings.plist");
}

// The path of what is there, be it a file or not; empty when nothing is.
std::string legacyFile(std::string_view path) {
  std::string whole = pathAtHome(path);
  return platform::services().fileServices.fileExists(whole) ? whole : std::string();
}

bool write(const Dictionary& root) {
  const std::string path = settingsFile();
  if (accountsettings::writeSettingsFile(root, path, false)) return true;
  platform::logToSystem("AccountMigrator: %@ could not be written", path);
  return false;
}

class AccountMigrator : public accountsettings::AccountsDataMigrator {
 public:
  bool executeMigrationSteps() override {
    const std::string mailAccounts = legacyFile("Library/Mail/Accounts.plist");
    const std::string dataAccess = legacyFile("Library/Preferences/com.vantor.DataAccess.plist");
    if (mailAccounts.empty() && dataAccess.empty()) return _bringUpToDate();
    return _buildFrom(mailAccounts, dataAccess);
  }

 private:
  static bool _buildFrom(const std::string& mailAccounts, const std::string& dataAccess) {
    const std::optional<AccountTypes> types = AccountTypes::read();
    if (!types) return false;
    const std::optional<Array> accounts = readLegacyAccounts(mailAccounts, dataAccess, *types);
    if (!accounts || !write({{"Accounts", *accounts}, {"Version", kSettingsVersion}})) return false;
    platform::logToSystem("AccountMigrator: built %@ with %ld accounts", settingsFile(),
                          static_cast<std::int64_t>(accounts->size()));
    return true;
  }

  static bool _bringUpToDate() {
    const std::string path = settingsFile();
    const propertylist::FileReadResult read =
        platform::services().fileServices.readPropertyListFile(path);
    if (!read.value && !read.exists) return true;  // nothing that could be old
    const Dictionary* const root = read.value ? read.value->asDictionary() : nullptr;
    if (root == nullptr) {
      platform::logToSystem("AccountMigrator: %@ cannot be read: %@", path,
                            read.value ? std::string("it holds no dictionary") : read.error);
      return false;
    }
    if (!isOutdated(*root)) return true;
    const std::optional<Dictionary> current = broughtUpToDate(*root);
    if (!current) {
      platform::logToSystem("AccountMigrator: no identifier could be made for an account of %@",
                            path);
      return false;
    }
    if (!write(*current)) return false;
    platform::logToSystem("AccountMigrator: brought %@ to version %ld", path, kSettingsVersion);
    return true;
  }
};

class MigratorClass : public platform::RuntimeClass,
                      public accountsettings::AccountsDataMigratorClass {
 public:
  MigratorClass() { platform::registerClass(*this); }
  std::string className() const override { return "AccountsDataMigrator"; }
  std::unique_ptr<accountsettings::AccountsDataMigrator> init() override {
    return std::make_unique<AccountMigrator>();
  }
};

// Made, and thereby registered, while the bundle is loaded, and never destroyed: the registry
// answers it until the process is gone, also to what runs at its exit.
auto& migratorClass = *new MigratorClass;

}  // namespace
}  // namespace accountsdatamigrator
