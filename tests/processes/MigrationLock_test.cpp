// The migration lock between processes.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <poll.h>
#include <sys/file.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <functional>
#include <stdexcept>
#include <string>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace accountsettings {
namespace {

// A child process that does its work a letter at a time: `work` gets a function that tells the test
// a letter and one that waits for the test's go-ahead.
class Child {
 public:
  using Say = std::function<void(char)>;
  using Wait = std::function<void()>;

  Child(const std::string& imagePath, const std::function<void(const Say&, const Wait&)>& work) {
    int toTest[2];
    int toChild[2];
    if (::pipe(toTest) != 0 || ::pipe(toChild) != 0) throw std::runtime_error("pipe");
    _process = ::fork();
    if (_process == 0) {
      ::prctl(PR_SET_PDEATHSIG, SIGKILL);  // not longer than the test
      ::close(toTest[0]);
      ::close(toChild[1]);
      const deviceimage::DeviceImageServices services(
          deviceimage::DeviceImage::open(imagePath).image);
      platform::install(services.services());
      work(
          [&](char letter) {
            if (::write(toTest[1], &letter, 1) != 1) ::_exit(1);
          },
          [&] {
            char go = 0;
            if (::read(toChild[0], &go, 1) != 1) ::_exit(1);
          });
      ::_exit(0);
    }
    ::close(toTest[1]);
    ::close(toChild[0]);
    _from = toTest[0];
    _to = toChild[1];
  }
  ~Child() {
    kill();
    ::close(_from);
    ::close(_to);
  }
  Child(const Child&) = delete;
  Child& operator=(const Child&) = delete;

  // The next letter that the child says; '-' when it has ended, or says nothing for `seconds`.
  char hear(int seconds = 60) const {
    pollfd descriptor = {_from, POLLIN, 0};
    if (::poll(&descriptor, 1, seconds * 1000) != 1) return '-';
    char letter = 0;
    return ::read(_from, &letter, 1) == 1 ? letter : '-';
  }
  pid_t process() const { return _process; }
  void go() const { EXPECT_EQ(::write(_to, "g", 1), 1); }
  void kill() {
    if (_process <= 0) return;
    ::kill(_process, SIGKILL);
    ::waitpid(_process, nullptr, 0);
    _process = 0;
  }

 private:
  pid_t _process = 0;
  int _from = -1;
  int _to = -1;
};

class MigrationLockOfAnImage : public testing::Test {
 protected:
  // A process that holds the lock from 'h' on, until it is told to go on, and says 'r' then.
  static void holdLock(const Child::Say& say, const Child::Wait& wait) {
    const platform::HeldFileLockPtr lock = ASSAccountsManager::createAndLockMigrationLock();
    say(lock == nullptr ? 'n' : 'h');
    wait();
    say('r');
    ASSAccountsManager::releaseMigrationLock(lock);
  }
  // Whether somebody holds the lock, asked of the file itself.
  bool isHeld() const {
    const int file = ::open(image.path("tmp/AccountMigrationInProgress").c_str(), O_RDWR);
    const bool held = ::flock(file, LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK;
    ::close(file);
    return held;
  }
  // Waits until a process waits for a lock of this machine's files.
  static void waitForAWaiter(pid_t process) {
    const std::string mark = " " + std::to_string(process) + " ";
    for (bool waits = false; !waits;) {
      std::ifstream locks("/proc/locks");
      for (std::string line; std::getline(locks, line);)
        waits =
            waits || (line.find("->") != std::string::npos && line.find(mark) != std::string::npos);
    }
  }
  bool lockFileExists() const {
    return std::filesystem::exists(image.path("tmp/AccountMigrationInProgress"));
  }
  std::string root() const { return image.root().string(); }

  deviceimage::TemporaryImage image;
};

TEST_F(MigrationLockOfAnImage, ASecondProcessWaitsForTheFirst) {
  const Child first(root(), holdLock);
  ASSERT_EQ(first.hear(), 'h');
  int said[2];
  ASSERT_EQ(::pipe(said), 0);  // what both say, in order
  const Child second(root(), [&](const Child::Say& say, const Child::Wait&) {
    say('b');
    const platform::HeldFileLockPtr lock = ASSAccountsManager::createAndLockMigrationLock();
    if (::write(said[1], "s", 1) != 1) ::_exit(1);
    say('s');
    ASSAccountsManager::releaseMigrationLock(lock);
  });
  ASSERT_EQ(second.hear(), 'b');
  EXPECT_TRUE(isHeld());
  waitForAWaiter(second.process());
  ASSERT_EQ(::write(said[1], "f", 1), 1);
  first.go();
  EXPECT_EQ(first.hear(), 'r');
  EXPECT_EQ(second.hear(), 's');
  char order[2] = {};
  ASSERT_EQ(::read(said[0], order, 2), 2);
  EXPECT_EQ(std::string(order, 2), "fs");
  EXPECT_TRUE(lockFileExists());
}

TEST_F(MigrationLockOfAnImage, AKilledHolderHoldsNothing) {
  Child holder(root(), holdLock);
  ASSERT_EQ(holder.hear(), 'h');
  const Child waiter(root(), [](const Child::Say& say, const Child::Wait&) {
    say('b');
    say(ASSAccountsManager::createAndLockMigrationLock() == nullptr ? 'n' : 'h');
  });
  ASSERT_EQ(waiter.hear(), 'b');
  waitForAWaiter(waiter.process());
  holder.kill();
  EXPECT_EQ(waiter.hear(1), 'h');
  EXPECT_TRUE(lockFileExists());
}

TEST_F(MigrationLockOfAnImage, AWaitEndsWithTheMigrationAndHoldsNothing) {
  const Child migration(root(), holdLock);
  ASSERT_EQ(migration.hear(), 'h');
  const Child reader(root(), [](const Child::Say& say, const Child::Wait& wait) {
    ASSAccountsManager::waitForMigrationToFinish();
    say('w');
    wait();
  });
  waitForAWaiter(reader.process());
  migration.go();
  EXPECT_EQ(reader.hear(), 'w');
  EXPECT_EQ(migration.hear(), 'r');
  const Child next(root(), holdLock);
  EXPECT_EQ(next.hear(), 'h');  // although the reader is still there
}

TEST_F(MigrationLockOfAnImage, AWaitWithoutAMigrationEndsAtOnce) {
  const Child reader(root(), [](const Child::Say& say, const Child::Wait&) {
    ASSAccountsManager::waitForMigrationToFinish();
    say('w');
  });
  EXPECT_EQ(reader.hear(), 'w');
}

TEST_F(MigrationLockOfAnImage, AReleaseFreesItAlsoWhenAChildHasTheOpenFile) {
  const Child holder(root(), [](const Child::Say& say, const Child::Wait& wait) {
    const platform::HeldFileLockPtr lock = ASSAccountsManager::createAndLockMigrationLock();
    const pid_t child = ::fork();
    if (child == 0) {
      ::prctl(PR_SET_PDEATHSIG, SIGKILL);
      say('c');
      ::pause();
      ::_exit(0);
    }
    wait();
    ASSAccountsManager::releaseMigrationLock(lock);
    say('r');
    wait();
  });
  ASSERT_EQ(holder.hear(), 'c');
  EXPECT_TRUE(isHeld());
  holder.go();
  ASSERT_EQ(holder.hear(), 'r');
  EXPECT_FALSE(isHeld());
}

TEST_F(MigrationLockOfAnImage, ALinkInItsPlaceGivesNoLock) {
  std::filesystem::create_symlink("/tmp/elsewhere", image.path("tmp/AccountMigrationInProgress"));
  const Child holder(root(), holdLock);
  EXPECT_EQ(holder.hear(), 'n');
}

}  // namespace
}  // namespace accountsettings
