#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr const char* kName = "AccountMigrationInProgress";

class MigrationLock : public ::testing::Test {
 protected:
  AccountsDevice device;
};

TEST_F(MigrationLock, IsHeldFromItsMakingToItsRelease) {
  const platform::HeldFileLockPtr lock = ASSAccountsManager::createAndLockMigrationLock();
  ASSERT_NE(lock, nullptr);
  EXPECT_TRUE(device.fileLock.isHeld(kName));
  ASSAccountsManager::releaseMigrationLock(lock);
  EXPECT_FALSE(device.fileLock.isHeld(kName));
}

TEST_F(MigrationLock, IsNoneWhenItCannotBeMade) {
  device.fileLock.failNext("lockByName");
  EXPECT_EQ(ASSAccountsManager::createAndLockMigrationLock(), nullptr);
}

TEST_F(MigrationLock, HoldsASecondTakerBackUntilItIsReleased) {
  const platform::HeldFileLockPtr first = ASSAccountsManager::createAndLockMigrationLock();
  std::atomic<bool> releasing = false;
  bool waited = false;
  std::thread second([&] {
    const platform::HeldFileLockPtr lock = ASSAccountsManager::createAndLockMigrationLock();
    waited = releasing;
    ASSAccountsManager::releaseMigrationLock(lock);
  });
  while (device.fileLock.waiting() == 0) std::this_thread::yield();
  releasing = true;
  ASSAccountsManager::releaseMigrationLock(first);
  second.join();
  EXPECT_TRUE(waited);
}

TEST_F(MigrationLock, WaitingWithoutAMigrationReturnsAndHoldsNothing) {
  ASSAccountsManager::waitForMigrationToFinish();
  EXPECT_FALSE(device.fileLock.isHeld(kName));
  EXPECT_EQ(device.fileLock.calls(), (CallJournal{"lockByName(AccountMigrationInProgress)",
                                                  "unlock(AccountMigrationInProgress)"}));
}

TEST_F(MigrationLock, WaitingLastsUntilTheMigrationIsOver) {
  const platform::HeldFileLockPtr migration = ASSAccountsManager::createAndLockMigrationLock();
  std::atomic<bool> over = false;
  bool waited = false;
  std::thread reader([&] {
    ASSAccountsManager::waitForMigrationToFinish();
    waited = over;
  });
  while (device.fileLock.waiting() == 0) std::this_thread::yield();
  over = true;
  ASSAccountsManager::releaseMigrationLock(migration);
  reader.join();
  EXPECT_TRUE(waited);
  EXPECT_FALSE(device.fileLock.isHeld(kName));
}

TEST_F(MigrationLock, WaitingForALockThatCannotBeMadeReturns) {
  device.fileLock.failNext("lockByName");
  ASSAccountsManager::waitForMigrationToFinish();
  EXPECT_EQ(device.logLines(), Lines());
}

}  // namespace
}  // namespace accountsettings
