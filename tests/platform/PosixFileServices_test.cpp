#include "platform/posix/PosixFileServices.h"

#include <gtest/gtest.h>
#include <pthread.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <thread>

#include "platform/testing/TemporaryDirectory.h"

namespace platform {
namespace {

class PosixFileServicesTest : public testing::Test {
 protected:
  std::string path(const std::string& name) { return directory.path() + "/" + name; }
  static void write(const std::string& path, const std::string& text) {
    std::ofstream(path, std::fstream::binary) << text;
  }
  static std::string read(const std::string& path) {
    std::ifstream file(path, std::fstream::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }
  static struct stat statusOf(const std::string& path) {
    struct stat status = {};
    EXPECT_EQ(::lstat(path.c_str(), &status), 0) << path;
    return status;
  }
  static unsigned modeOf(const std::string& path) { return statusOf(path).st_mode & ALLPERMS; }
  static std::span<const std::uint8_t> bytesOf(const std::string& text) {
    return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
  }

  TemporaryDirectory directory;
  PosixFileServices files;
};

TEST_F(PosixFileServicesTest, NamesTemporaryFilesInTheProcesssDirectoryForThem) {
  ASSERT_EQ(::setenv("TMPDIR", directory.path().c_str(), 1), 0);
  const auto name = files.temporaryFileName();
  ASSERT_TRUE(name.has_value());
  EXPECT_EQ(std::filesystem::path(*name).parent_path(), directory.path());
}

TEST_F(PosixFileServicesTest, GoesOnAfterAShortWriteAndReportsWhyItEndsEarly) {
  ASSERT_NE(std::signal(SIGXFSZ, SIG_IGN), SIG_ERR);
  const rlimit limit = {100, RLIM_INFINITY};
  ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &limit), 0);
  const auto created = files.createPrivateFile(path("file"));
  const Status written = files.writeAll(created.descriptor, bytesOf(std::string(150, 'x')));
  EXPECT_TRUE(files.closeFile(created.descriptor).isSuccess());
  EXPECT_EQ(written.code, EFBIG);
  EXPECT_EQ(read(path("file")), std::string(100, 'x'));
}

TEST_F(PosixFileServicesTest, WritesEveryByteOnceWhileSignalsInterruptIt) {
  struct sigaction interrupt = {};
  interrupt.sa_handler = [](int) {};  // without SA_RESTART
  ASSERT_EQ(::sigaction(SIGUSR1, &interrupt, nullptr), 0);
  std::string text;
  for (int i = 0; i < 200'000; ++i) text += std::to_string(i);
  int ends[2] = {};
  ASSERT_EQ(::pipe(ends), 0);
  std::atomic<bool> done = false;
  Status written;
  std::thread writer([&] {
    written = files.writeAll(ends[1], bytesOf(text));
    ::close(ends[1]);
    done = true;
    while (done) std::this_thread::yield();  // stays a thread that signals can be sent to
  });
  std::string arrived;
  char buffer[4096];
  for (;;) {
    if (!done) ::pthread_kill(writer.native_handle(), SIGUSR1);
    const ssize_t count = ::read(ends[0], buffer, sizeof buffer);
    if (count <= 0) break;
    arrived.append(buffer, static_cast<std::size_t>(count));
  }
  while (!done) std::this_thread::yield();
  done = false;
  writer.join();
  ::close(ends[0]);
  EXPECT_TRUE(written.isSuccess());
  EXPECT_EQ(arrived.size(), text.size());
  EXPECT_TRUE(arrived == text);
}

TEST_F(PosixFileServicesTest, SaysWhatItCouldNotDoToWhichFile) {
  const Status failed = files.removeFile(path("missing"));
  EXPECT_EQ(failed.code, ENOENT);
  EXPECT_EQ(failed.error.value().description,
            "cannot remove " + path("missing") + ": No such file or directory");
}

using SetAside = PosixFileServicesTest;

TEST_F(SetAside, GivesTheFileASecondNameAndTakesItFromOthersEyes) {
  write(path("settings"), "content");
  std::filesystem::permissions(path("settings"), std::filesystem::perms(0666));
  EXPECT_TRUE(files.setAsideUnreadableFile(path("settings")).isSuccess());
  EXPECT_EQ(statusOf(path("settings.unreadable-1")).st_ino, statusOf(path("settings")).st_ino);
  EXPECT_EQ(modeOf(path("settings.unreadable-1")), 0600U);
}

TEST_F(SetAside, KeepsOneFileOnce) {
  write(path("settings"), "content");
  for (int times = 0; times < 3; ++times)
    EXPECT_TRUE(files.setAsideUnreadableFile(path("settings")).isSuccess());
  EXPECT_TRUE(files.fileExists(path("settings.unreadable-1")));
  EXPECT_FALSE(files.fileExists(path("settings.unreadable-2")));
}

TEST_F(SetAside, OverwritesNothingThatHasTheName) {
  write(path("settings"), "content");
  write(path("settings.unreadable-1"), "other");
  std::filesystem::create_symlink(path("target"), path("settings.unreadable-2"));
  std::filesystem::create_directory(path("settings.unreadable-3"));
  EXPECT_TRUE(files.setAsideUnreadableFile(path("settings")).isSuccess());
  EXPECT_EQ(read(path("settings.unreadable-1")), "other");
  EXPECT_FALSE(files.fileExists(path("target")));
  EXPECT_EQ(read(path("settings.unreadable-4")), "content");
}

TEST_F(SetAside, CopiesAFileThatHasOtherNamesAndLeavesTheirMode) {
  const std::string large(200'000, 'x');
  write(path("elsewhere"), large);
  std::filesystem::permissions(path("elsewhere"), std::filesystem::perms(0640));
  std::filesystem::create_hard_link(path("elsewhere"), path("settings"));
  EXPECT_TRUE(files.setAsideUnreadableFile(path("settings")).isSuccess());
  EXPECT_EQ(modeOf(path("elsewhere")), 0640U);
  EXPECT_EQ(modeOf(path("settings.unreadable-1")), 0600U);
  EXPECT_TRUE(read(path("settings.unreadable-1")) == large);
  EXPECT_EQ(statusOf(path("settings.unreadable-1")).st_uid, statusOf(path("elsewhere")).st_uid);
}

TEST_F(SetAside, KeepsALinkAsALinkAndDoesNotTouchItsTarget) {
  write(path("secret"), "secret");
  std::filesystem::permissions(path("secret"), std::filesystem::perms(0644));
  std::filesystem::create_symlink(path("secret"), path("settings"));
  EXPECT_TRUE(files.setAsideUnreadableFile(path("settings")).isSuccess());
  EXPECT_EQ(std::filesystem::read_symlink(path("settings.unreadable-1")), path("secret"));
  EXPECT_EQ(modeOf(path("secret")), 0644U);
}

TEST_F(SetAside, KeepsAFifoWithoutWaitingForAWriter) {
  ASSERT_EQ(::mkfifo(path("settings").c_str(), 0600), 0);
  EXPECT_TRUE(files.setAsideUnreadableFile(path("settings")).isSuccess());
  EXPECT_TRUE(S_ISFIFO(statusOf(path("settings.unreadable-1")).st_mode));
}

TEST_F(SetAside, FailsForADirectoryWhichNoRenameReplaces) {
  std::filesystem::create_directory(path("settings"));
  EXPECT_EQ(files.setAsideUnreadableFile(path("settings")).code, EISDIR);
  EXPECT_TRUE(std::filesystem::is_directory(path("settings")));
  EXPECT_FALSE(files.fileExists(path("settings.unreadable-1")));
}

TEST_F(SetAside, FailsWhenTheNameIsTooLongAndLeavesTheFile) {
  const std::string name(250, 'n');
  write(path(name), "content");
  EXPECT_EQ(files.setAsideUnreadableFile(path(name)).code, ENAMETOOLONG);
  EXPECT_EQ(read(path(name)), "content");
}

}  // namespace
}  // namespace platform
