// The process that migrate-legacy has migrate.
#include "tools/account-settings/LegacyMigrationProcess.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <memory>
#include <string>
#include <string_view>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/Descriptor.h"
#include "host/ChildProcess.h"
#include "host/LegacySettings.h"
#include "platform/Services.h"
#include "tools/account-settings/Commands.h"

namespace tools {
namespace {

using accountsettings::ASSAccountsManager;
using deviceimage::DeviceImage;

// What the library says when its migration has failed.
constexpr std::string_view kFailureLine =
    "[+[ASSAccountsManager _migrateAccountsIfNeeded]] Accounts migration failed";

// The image's locks, of which the migration lock is the starter's: it was taken before the settings
// file was copied, and is held until that file is where it belongs.
class StartersLocks : public platform::ExclusiveFileLock {
 public:
  explicit StartersLocks(platform::ExclusiveFileLock& locks) : _locks(locks) {}
  platform::HeldFileLockPtr lockByName(std::string_view name) override {
    if (name == host::kMigrationLock) return std::make_shared<platform::HeldFileLock>();
    return _locks.lockByName(name);
  }
  void unlock(const platform::HeldFileLockPtr& lock) override { _locks.unlock(lock); }

 private:
  platform::ExclusiveFileLock& _locks;
};

bool isMigrationLockHeld(const DeviceImage& image) {
  const deviceimage::Descriptor file(
      image.openFile(accountsettings::kAccountMigrationLockFilename, O_RDWR).descriptor);
  return file.isOpen() && ::flock(file.number(), LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK;
}

void migrateUnderStartersLock() {
  const platform::Services own = platform::services();
  StartersLocks locks(own.exclusiveFileLock);
  platform::install({own.accountFramework, own.bundleResources, own.calendarStore,
                     own.classRegistry, own.clock, own.contactsStore, own.deviceInfo, locks,
                     own.fileServices, own.preferences, own.processTable, own.restrictions,
                     own.runLoop, own.syncDataSource, own.systemLog, own.notifyCenter,
                     own.uuidGenerator, own.userDatabase});
  ASSAccountsManager::_migrateAccountsIfNeeded();
  platform::install(own);
}

}  // namespace

bool isLegacyMigrationProcess(int argumentCount, char** arguments) {
  return argumentCount == 3 && std::string_view(arguments[1]) == kLegacyMigrationArgument;
}

int migrateLegacyInThisProcess(char** arguments) {
  bool hasFailed = false;  // the library says so in its line alone
  const auto work = [&](const DeviceImage& image) {
    if (!isMigrationLockHeld(image)) return host::tellNotLoaded("nobody holds the migration lock");
    migrateUnderStartersLock();
    const std::string bundle = image.absolutePath(host::kAccountMigrator);
    if (hasFailed && platform::services().classRegistry.loadCodeBundle(bundle) == nullptr)
      return host::tellNotLoaded(bundle + " is no code that this program can load");
    return host::tellEnd(!hasFailed);
  };
  return host::workForHost(arguments[2], work, {"account-settings", [&](std::string_view line) {
                                                  hasFailed = hasFailed || line == kFailureLine;
                                                }});
}

}  // namespace tools
