// Setting a file aside where the system, or somebody else, stands in the way.
#include <dlfcn.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "platform/testing/JournaledFileServices.h"
#include "platform/testing/TemporaryDirectory.h"

namespace {

bool fileSystemHasLinks = true;
bool modesCanBeChanged = true;

template <typename Function>
Function* systemsOwn(const char* name) {
  return reinterpret_cast<Function*>(::dlsym(RTLD_NEXT, name));
}

}  // namespace

// These stand before the C library's, for the code under test too.
extern "C" {
__attribute__((visibility("default"))) int linkat(int fromDirectory, const char* from,
                                                  int toDirectory, const char* to, int flags) {
  static auto* const own = systemsOwn<decltype(linkat)>("linkat");
  if (fileSystemHasLinks) return own(fromDirectory, from, toDirectory, to, flags);
  errno = EPERM;
  return -1;
}
__attribute__((visibility("default"))) int fchmodat(int directory, const char* path, mode_t mode,
                                                    int flags) {
  static auto* const own = systemsOwn<decltype(fchmodat)>("fchmodat");
  if (modesCanBeChanged) return own(directory, path, mode, flags);
  errno = EPERM;
  return -1;
}
}

namespace platform {
namespace {

using Names = std::vector<std::string>;

class SetAsideFaults : public testing::Test {
 protected:
  std::string path(const std::string& name) { return directory.path() + "/" + name; }
  void write(const std::string& name, const std::string& text) {
    std::ofstream(path(name), std::fstream::binary) << text;
    std::filesystem::permissions(path(name), std::filesystem::perms(0600));
  }
  std::string read(const std::string& name) {
    std::ifstream file(path(name), std::fstream::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }
  Names names() {
    Names found;
    for (const auto& entry : std::filesystem::directory_iterator(directory.path()))
      found.push_back(entry.path().filename());
    std::sort(found.begin(), found.end());
    return found;
  }
  Status setAside() { return files.setAsideUnreadableFile(path("settings")); }

  TemporaryDirectory directory;
  JournaledFileServices files;
};

TEST_F(SetAsideFaults, FindsTheFileBehindAGapInTheNumbers) {
  write("settings", "content");
  std::filesystem::create_hard_link(path("settings"), path("settings.unreadable-12"));
  EXPECT_TRUE(setAside().isSuccess());
  EXPECT_EQ(names(), (Names{"settings", "settings.unreadable-12"}));
}

TEST_F(SetAsideFaults, TakesTheFirstFreeNumberAndNoOtherNameForOne) {
  for (const char* taken :
       {"settings.unreadable-1", "settings.unreadable-3", "settings.unreadable-02",
        "settings.unreadable-2x", "settings.unreadable-",
        "settings.unreadable-99999999999999999999", "other.unreadable-2"})
    write(taken, "another");
  write("settings", "content");
  EXPECT_TRUE(setAside().isSuccess());
  EXPECT_EQ(read("settings.unreadable-2"), "content");
}

TEST_F(SetAsideFaults, CopiesWhereThereAreNoLinksAndTheSameBytesOnlyOnce) {
  fileSystemHasLinks = false;
  write("settings", "content");
  for (int times = 0; times < 3; ++times) EXPECT_TRUE(setAside().isSuccess());
  EXPECT_EQ(names(), (Names{"settings", "settings.unreadable-1"}));
  EXPECT_EQ(read("settings.unreadable-1"), "content");

  write("settings", "CONTENT");  // as long, and different
  EXPECT_TRUE(setAside().isSuccess());
  EXPECT_EQ(read("settings.unreadable-1"), "content");
  EXPECT_EQ(read("settings.unreadable-2"), "CONTENT");
}

TEST_F(SetAsideFaults, TellsLongFilesApartByTheirLastByte) {
  fileSystemHasLinks = false;
  const std::string start(65536 * 2 - 1, 'x');
  write("settings", start + "a");
  EXPECT_TRUE(setAside().isSuccess());
  EXPECT_TRUE(setAside().isSuccess());
  write("settings", start + "b");
  EXPECT_TRUE(setAside().isSuccess());
  EXPECT_EQ(names(), (Names{"settings", "settings.unreadable-1", "settings.unreadable-2"}));
  EXPECT_TRUE(read("settings.unreadable-1") == start + "a");
  EXPECT_TRUE(read("settings.unreadable-2") == start + "b");
}

TEST_F(SetAsideFaults, DoesNotRelyOnACopyThatOthersCanRead) {
  write("settings", "content");
  write("settings.unreadable-1", "content");
  std::filesystem::permissions(path("settings.unreadable-1"), std::filesystem::perms(0644));
  EXPECT_TRUE(setAside().isSuccess());
  EXPECT_EQ(read("settings.unreadable-2"), "content");
}

TEST_F(SetAsideFaults, RemovesOnlyWhatItMadeItself) {
  write("settings", "content");
  std::filesystem::permissions(path("settings"), std::filesystem::perms(0644));
  modesCanBeChanged = false;
  EXPECT_EQ(setAside().code, EPERM);
  EXPECT_EQ(names(), (Names{"settings"}));
  std::filesystem::create_hard_link(path("settings"), path("settings.unreadable-1"));
  EXPECT_EQ(setAside().code, EPERM);
  EXPECT_EQ(names(), (Names{"settings", "settings.unreadable-1"}));
}

TEST_F(SetAsideFaults, WhicheverStepOfACopyFailsNoPartOfOneIsLeft) {
  fileSystemHasLinks = false;
  write("settings", "content");
  for (const char* step : {"createPrivateFile", "writeAll", "synchronizeFile", "closeFile"}) {
    SCOPED_TRACE(step);
    files.failNext(step, Status::failure(EIO, "injected"));
    EXPECT_EQ(setAside().code, EIO);
    EXPECT_EQ(names(), (Names{"settings"}));
  }
  EXPECT_TRUE(setAside().isSuccess());
  EXPECT_EQ(read("settings.unreadable-1"), "content");
}

TEST_F(SetAsideFaults, FailsUntilTheNewNameIsOnTheDisk) {
  write("settings", "content");
  files.failNext("synchronizeDirectoryOfFile", Status::failure(EIO, "injected"));
  EXPECT_EQ(setAside().code, EIO);
  EXPECT_TRUE(setAside().isSuccess());
  EXPECT_EQ(names(), (Names{"settings", "settings.unreadable-1"}));
}

TEST_F(SetAsideFaults, LooksAgainWhenSomebodyElseTakesTheFreeName) {
  fileSystemHasLinks = false;
  write("settings", "content");
  files.decideBy([this](const std::string& call) -> std::optional<PlannedAnswer> {
    if (call.starts_with("createPrivateFile") && names().size() == 1)
      write("settings.unreadable-1", "another");
    return std::nullopt;
  });
  EXPECT_TRUE(setAside().isSuccess());
  EXPECT_EQ(read("settings.unreadable-1"), "another");
  EXPECT_EQ(read("settings.unreadable-2"), "content");
}

TEST_F(SetAsideFaults, GivesUpWhenEveryNameIsTakenAtTheLastMoment) {
  write("settings", "content");
  fileSystemHasLinks = false;
  files.failEvery("createPrivateFile", Status::failure(EEXIST, "injected"));
  EXPECT_EQ(setAside().code, EEXIST);
  EXPECT_EQ(names(), (Names{"settings"}));
}

}  // namespace
}  // namespace platform
