// The process of the migration host's legacy step.
#include <cerrno>
#include <memory>
#include <string_view>

#include "QuillnetAccountTypeRemoval/AccountsDataMigrator.h"
#include "host/ChildProcess.h"
#include "host/KeptSettings.h"
#include "host/LegacyStep.h"
#include "platform/Services.h"

namespace host {
namespace {

using accountsettings::AccountsDataMigrator;
using deviceimage::DeviceImage;

// The image's migrator, or why there is none.
struct MadeMigrator {
  std::unique_ptr<AccountsDataMigrator> migrator;
  std::string error;
};

MadeMigrator makeMigrator(const DeviceImage& image) {
  platform::ClassRegistry& registry = platform::services().classRegistry;
  const std::string path = image.absolutePath(kAccountMigrator);
  if (registry.loadCodeBundle(path) == nullptr) return {nullptr, path + " could not be loaded"};
  auto* const migratorClass = dynamic_cast<accountsettings::AccountsDataMigratorClass*>(
      registry.classNamed(kAccountMigratorClass));
  if (migratorClass == nullptr)
    return {nullptr,
            path + " offers no accounts data migrator named " + std::string(kAccountMigratorClass)};
  MadeMigrator made = {migratorClass->init(), {}};
  if (!made.migrator) made.error = std::string(kAccountMigratorClass) + " made no migrator";
  return made;
}

// Under the lock, so that the copy is of the file that goes. The settings file goes before the
// migrator comes, which takes legacy files to be all there is; it goes as late as can be.
int migrate(const DeviceImage& image) {
  const LegacyNeed need = legacyNeedOf(image);
  if (!need.any()) return tellNotNeeded();
  const MadeMigrator made = makeMigrator(image);
  if (!made.migrator) return tellNotLoaded(made.error);
  const std::string settings = image.settingsFile();
  if (const std::string error = keepSettings(image); !error.empty())
    return tellNotBegun(settings + " cannot be copied: " + error);
  if (need.mailAccounts || need.dataAccess) {
    const platform::Status removed = image.removeFile(DeviceImage::kSettingsFile);
    if (!removed.isSuccess() && removed.code != ENOENT)
      return tellNotBegun(settings + " cannot be removed: " + removed.error->description);
  }
  return tellEnd(made.migrator->executeMigrationSteps());
}

}  // namespace

bool isLegacyProcess(int argumentCount, char** arguments) {
  return argumentCount == 3 && std::string_view(arguments[1]) == kMigrateLegacyArgument;
}

int migrateLegacyInThisProcess(char** arguments) {
  return workForHost(arguments[2], [](const DeviceImage& image) {
    platform::ExclusiveFileLock& locks = platform::services().exclusiveFileLock;
    tellWaiting();
    const platform::HeldFileLockPtr lock = locks.lockByName(kMigrationLock);
    if (!lock)
      return tellNotBegun("the lock " + image.temporaryDirectory() + "/" +
                          std::string(kMigrationLock) + " could not be made");
    tellBegun();
    const int status = migrate(image);
    locks.unlock(lock);
    return status;
  });
}

}  // namespace host
