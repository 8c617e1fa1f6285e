#include "tools/account-settings/ImageAccess.h"

#include <fcntl.h>
#include <fmt/format.h>

#include <chrono>
#include <cstdlib>
#include <string>
#include <thread>
#include <utility>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/Descriptor.h"
#include "tools/common/ExitCode.h"

namespace tools {

using accountsettings::ASSAccountsManager;
using deviceimage::DeviceImage;
using deviceimage::ImageLock;

std::unique_ptr<ImageLock> takeLock(const DeviceImage& image, double wait) {
  using Clock = std::chrono::steady_clock;
  constexpr auto kPause = std::chrono::milliseconds(20);
  const auto end = Clock::now() + std::chrono::duration<double>(wait);
  for (;;) {
    ImageLock::Attempt attempt = ImageLock::tryAcquire(image);
    if (attempt.outcome == ImageLock::Outcome::held) return std::move(attempt.lock);
    if (attempt.outcome != ImageLock::Outcome::heldByAnother)
      throw CommandFailure(ExitCode::refused, attempt.error);
    if (Clock::now() >= end)
      throw CommandFailure(
          ExitCode::heldByAnotherRun,
          fmt::format("{} (waited {} seconds; --wait gives another time)", attempt.error, wait));
    std::this_thread::sleep_for(kPause);
  }
}

void useTemporaryDirectory(const DeviceImage& image) {
  const deviceimage::FileLook look = image.lookAt(DeviceImage::kTemporaryDirectory);
  if (look.kind != deviceimage::FileLook::Kind::directory)
    throw CommandFailure(ExitCode::refused,
                         fmt::format("{} is no directory; nothing was changed; make it",
                                     image.temporaryDirectory()));
  if (look.isOpenToOthers)
    throw CommandFailure(
        ExitCode::refused,
        fmt::format("everybody may replace the files in {}, the new settings too; nothing was "
                    "changed; take that right from others (chmod o-w)",
                    image.temporaryDirectory()));
  ::setenv("TMPDIR", image.temporaryDirectory().c_str(), 1);
}

platform::HeldFileLockPtr holdMigrationLock(const DeviceImage& image) {
  if (auto lock = ASSAccountsManager::createAndLockMigrationLock()) return lock;
  const deviceimage::OpenedFile file =
      image.openFile(accountsettings::kAccountMigrationLockFilename, O_RDWR);
  const deviceimage::Descriptor closing(file.descriptor);
  throw CommandFailure(
      ExitCode::refused,
      fmt::format(
          "{}: {}; so nobody can tell whether a migration runs; see that it is a plain file "
          "that you may write",
          image.absolutePath(accountsettings::kAccountMigrationLockFilename),
          file.status.isSuccess() ? "the file cannot be locked" : file.status.error->description));
}

// What ASSAccountsManager::waitForMigrationToFinish does, which returns as well when the lock
// cannot be made.
void waitForOtherMigrations(const DeviceImage& image) {
  ASSAccountsManager::releaseMigrationLock(holdMigrationLock(image));
}

}  // namespace tools
