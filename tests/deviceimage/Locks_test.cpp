#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <future>

#include "deviceimage/ImageLock.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

constexpr const char* kName = "AccountMigrationInProgress";

// A child process that does `first`, says so, and then waits to be killed.
class WaitingChild {
 public:
  template <typename First>
  explicit WaitingChild(const First& first) {
    int ends[2];
    if (::pipe(ends) != 0) throw std::runtime_error("pipe");
    _child = ::fork();
    if (_child == 0) {
      const bool done = first();
      if (::write(ends[1], done ? "y" : "n", 1) == 1) ::pause();
      ::_exit(1);
    }
    char answer = 'n';
    saidYes = ::read(ends[0], &answer, 1) == 1 && answer == 'y';
    ::close(ends[0]);
    ::close(ends[1]);
  }
  ~WaitingChild() { kill(); }
  void kill() {
    if (_child <= 0) return;
    ::kill(_child, SIGKILL);
    ::waitpid(_child, nullptr, 0);
    _child = 0;
  }
  bool saidYes = false;

 private:
  pid_t _child = 0;
};

TEST(ImageLock, IsHeldByOneRunAtATimeUntilThatEndsHoweverItEnds) {
  const TemporaryImage made;
  std::unique_ptr<ImageLock> childs;
  WaitingChild child([&] {
    childs = ImageLock::tryAcquire(*made.image).lock;
    return childs != nullptr;
  });
  ASSERT_TRUE(child.saidYes);
  const ImageLock::Attempt refused = ImageLock::tryAcquire(*made.image);
  EXPECT_EQ(refused.outcome, ImageLock::Outcome::heldByAnother);
  EXPECT_NE(refused.error, "");
  child.kill();
  const ImageLock::Attempt taken = ImageLock::tryAcquire(*made.image);
  EXPECT_EQ(taken.outcome, ImageLock::Outcome::held);
  EXPECT_EQ(ImageLock::tryAcquire(*made.image).outcome, ImageLock::Outcome::heldByAnother);
}

TEST(ImageLock, IsFreeAgainWhenItsObjectGoes) {
  const TemporaryImage made;
  ASSERT_NE(ImageLock::tryAcquire(*made.image).lock, nullptr);
  EXPECT_NE(ImageLock::tryAcquire(*made.image).lock, nullptr);
}

TEST(ImageLock, FailsWithAReasonWhereNoFileCanBe) {
  const TemporaryImage made;
  std::filesystem::remove(made.path("var/run/image.lock"));
  std::filesystem::create_directory(made.path("var/run/image.lock"));
  const ImageLock::Attempt failed = ImageLock::tryAcquire(*made.image);
  EXPECT_EQ(failed.outcome, ImageLock::Outcome::failed);
  EXPECT_NE(failed.error, "");
}

TEST(ImageFileLocks, ExcludeEachOtherWithinOneProcess) {
  const TemporaryImage made;
  ImageFileLocks locks(made.image);
  const platform::HeldFileLockPtr first = locks.lockByName(kName);
  ASSERT_NE(first, nullptr);
  EXPECT_TRUE(std::filesystem::is_regular_file(made.path("tmp/AccountMigrationInProgress")));
  std::atomic<bool> isFreed = false;
  std::future<bool> second = std::async(std::launch::async, [&] {
    const platform::HeldFileLockPtr waited = locks.lockByName(kName);
    return waited != nullptr && isFreed;  // read under the lock
  });
  isFreed = true;
  locks.unlock(first);
  EXPECT_TRUE(second.get());
  locks.unlock(first);
  locks.unlock(nullptr);
}

TEST(ImageFileLocks, BelongToMobileAlsoWhenRootIsTheFirstToTakeThem) {
  if (::geteuid() != 0) GTEST_SKIP() << "only root makes files for others";
  const TemporaryImage made;
  ImageFileLocks locks(made.image);
  ASSERT_NE(locks.lockByName(kName), nullptr);
  struct stat status {};
  ASSERT_EQ(::stat(made.path("tmp/AccountMigrationInProgress").c_str(), &status), 0);
  EXPECT_EQ(status.st_uid, 501U);
  EXPECT_EQ(status.st_gid, 501U);
  EXPECT_EQ(status.st_mode & 07777U, 0600U);
}

TEST(ImageFileLocks, AreAnotherThanTheImagesOwn) {
  const TemporaryImage made;
  ImageFileLocks locks(made.image);
  const ImageLock::Attempt taken = ImageLock::tryAcquire(*made.image);
  ASSERT_EQ(taken.outcome, ImageLock::Outcome::held);
  EXPECT_NE(locks.lockByName(kName), nullptr);
}

TEST(ImageFileLocks, AreFreeWhenTheirHolderIsKilled) {
  const TemporaryImage made;
  ImageFileLocks locks(made.image);
  platform::HeldFileLockPtr childs;
  WaitingChild child([&] {
    childs = locks.lockByName(kName);
    return childs != nullptr;
  });
  ASSERT_TRUE(child.saidYes);
  child.kill();
  EXPECT_NE(locks.lockByName(kName), nullptr);
}

TEST(ImageFileLocks, AreNoneWhereTheNameIsNoPlainNameOrTheFileNoFile) {
  const TemporaryImage made;
  ImageFileLocks locks(made.image);
  std::filesystem::create_directory(made.path("tmp/directory"));
  std::filesystem::create_symlink(made.directory.path / "outside", made.path("tmp/link"));
  for (const char* name : {"", ".", "..", "a/b", "../x", "directory", "link"})
    EXPECT_EQ(locks.lockByName(name), nullptr) << name;
  EXPECT_FALSE(std::filesystem::exists(made.directory.path / "outside"));
}

}  // namespace
}  // namespace deviceimage
