// Keeping other processes out: the migration lock, and the data-access daemon that is to leave.

#include <chrono>
#include <csignal>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "QuillnetAccountTypeRemoval/ProcessLookup.h"
#include "platform/Services.h"

namespace accountsettings {
namespace {

using std::chrono::milliseconds;

constexpr std::string_view kMigrationLockName = "AccountMigrationInProgress";
constexpr const char* kDaemonName = "tallowd";
// The daemon exits when a backup is about to start.
constexpr std::string_view kExitNotification = "com.vantor.Orvette.BackupAgent.WillStart";
constexpr double kLongestWait = 5.0;  // seconds
constexpr milliseconds kPoliteSlice(250);
constexpr milliseconds kForcedSlice(10);

// Whether `daemon` is gone before the time is up. A failed lookup counts as gone.
bool leavesInTime(pid_t daemon, milliseconds slice) {
  const platform::Services& services = platform::services();
  const double start = services.clock.absoluteTime();
  do {
    if (findProcessIDByName(kDaemonName) != daemon) return true;
    services.runLoop.runForAtMost(slice);
  } while (services.clock.absoluteTime() - start <= kLongestWait);
  return false;
}

void killDaemon() {
  const pid_t now = findProcessIDByName(kDaemonName);
  if (now < 0) return;
  platform::services()
      .processTable.sendSignal(now, SIGKILL)
      .ignore("the wait that follows sees whether the daemon goes");
}

void haveDaemonLeave(pid_t daemon) {
  if (leavesInTime(daemon, kPoliteSlice)) return;
  platform::logToSystem("%s does not seem to want to quit. Sending it a SIGKILL", kDaemonName);
  killDaemon();
  if (leavesInTime(daemon, kForcedSlice)) return;
  platform::logToSystem(
      "%s decided it didn't want to play well with others and refused to exit. We're going to "
      "continue with the backup/restore anyway and hope for the best.",
      kDaemonName);
}

// Takes the web engine's lock again at its end if the thread holds it at its beginning: while the
// run loop runs, the web engine's thread may take it.
class KeptWebEngineLock {
 public:
  KeptWebEngineLock() : _lock(platform::services().webEngineThreadLock) {
    if (_lock != nullptr && !_lock->isHeld()) _lock = nullptr;
  }
  ~KeptWebEngineLock() {
    if (_lock != nullptr) _lock->acquire();
  }
  KeptWebEngineLock(const KeptWebEngineLock&) = delete;
  KeptWebEngineLock& operator=(const KeptWebEngineLock&) = delete;

 private:
  platform::WebEngineThreadLock* _lock;
};

}  // namespace

platform::HeldFileLockPtr ASSAccountsManager::createAndLockMigrationLock() {
  return platform::services().exclusiveFileLock.lockByName(kMigrationLockName);
}

void ASSAccountsManager::releaseMigrationLock(const platform::HeldFileLockPtr& lock) {
  platform::services().exclusiveFileLock.unlock(lock);
}

void ASSAccountsManager::waitForMigrationToFinish() {
  releaseMigrationLock(createAndLockMigrationLock());
}

void ASSAccountsManager::killDataAccessIfNecessary() {
  const platform::Services& services = platform::services();
  const pid_t own = services.processTable.ownProcessIdentifier();
  const pid_t daemon = findProcessIDByName(kDaemonName);
  if (daemon < 0 || daemon == own) return;
  platform::logToSystem("Performing account migration. Asking tallowd to exit");
  services.notifyCenter.postSystemNotification(kExitNotification);
  const KeptWebEngineLock kept;
  haveDaemonLeave(daemon);
}

}  // namespace accountsettings
