#pragma once

#include <atomic>
#include <thread>

#include "platform/ExclusiveFileLock.h"
#include "tests/contracts/Port.h"

// One device on which no lock is held.
class ExclusiveFileLockUnderTest {
 public:
  virtual ~ExclusiveFileLockUnderTest() = default;
  virtual platform::ExclusiveFileLock& service() = 0;
};
using ExclusiveFileLockPort = Port<ExclusiveFileLockUnderTest>;

// A lock that is not free when it must be makes these tests wait until their time limit.
class ExclusiveFileLockContract : public Contract<ExclusiveFileLockUnderTest> {
 protected:
  platform::ExclusiveFileLock& service() { return device->service(); }
};

TEST_P(ExclusiveFileLockContract, HoldsASecondLockerBackUntilTheFirstUnlocks) {
  const auto first = service().lockByName("AccountMigrationInProgress");
  ASSERT_NE(first, nullptr);
  std::atomic<bool> unlocking = false;
  bool waitedForTheFirst = false;
  std::thread second([&] {
    const auto lock = service().lockByName("AccountMigrationInProgress");
    waitedForTheFirst = unlocking;
    service().unlock(lock);
  });
  unlocking = true;
  service().unlock(first);
  second.join();
  EXPECT_TRUE(waitedForTheFirst);
}

TEST_P(ExclusiveFileLockContract, KeepsLocksOfDifferentNamesApart) {
  const auto one = service().lockByName("One");
  const auto two = service().lockByName("Two");
  EXPECT_NE(one, nullptr);
  EXPECT_NE(two, nullptr);
  service().unlock(one);
  service().unlock(two);
}

TEST_P(ExclusiveFileLockContract, FreesALockOnceHoweverOftenItIsUnlocked) {
  const auto first = service().lockByName("Lock");
  service().unlock(first);
  const auto second = service().lockByName("Lock");
  ASSERT_NE(second, nullptr);
  service().unlock(first);  // must not free the second
  service().unlock(nullptr);
  std::atomic<bool> unlocking = false;
  bool waitedForTheSecond = false;
  std::thread third([&] {
    const auto lock = service().lockByName("Lock");
    waitedForTheSecond = unlocking;
    service().unlock(lock);
  });
  unlocking = true;
  service().unlock(second);
  third.join();
  EXPECT_TRUE(waitedForTheSecond);
}

TEST_P(ExclusiveFileLockContract, FreesTheLockOfAHolderThatIsGone) {
  auto gone = service().lockByName("Lock");
  gone.reset();
  const auto next = service().lockByName("Lock");
  EXPECT_NE(next, nullptr);
  service().unlock(next);
}
