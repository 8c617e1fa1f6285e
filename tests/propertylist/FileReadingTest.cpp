#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace propertylist {
namespace {

class FileReading : public testing::Test {
 protected:
  FileReading() {
    std::string pattern = testing::TempDir() + "/property-list-XXXXXX";
    folder = ::mkdtemp(pattern.data());
  }
  ~FileReading() override { std::filesystem::remove_all(folder); }

  std::string put(const std::string& name, const Bytes& bytes) {
    std::ofstream(folder / name, std::fstream::binary)
        .write(reinterpret_cast<const char*>(bytes.data()),
               static_cast<std::streamsize>(bytes.size()));
    return (folder / name).string();
  }

  // The error without the path before it.
  static std::string errorOf(const std::string& path, bool exists) {
    const FileReadResult result = readPropertyListFile(path);
    EXPECT_EQ(result.value, std::nullopt);
    EXPECT_EQ(result.exists, exists);
    EXPECT_EQ(result.error.substr(0, path.size() + 2), path + ": ");
    return result.error.substr(path.size() + 2);
  }

  std::filesystem::path folder;
};

TEST_F(FileReading, GivesTheValueOfAFileOfEitherForm) {
  const Value value(Dictionary{{"Version", 12}});
  const std::string xml = *writeXMLPropertyList(value);
  for (const Bytes& bytes : {*writeBinaryPropertyList(value), Bytes(xml.begin(), xml.end())}) {
    const FileReadResult result = readPropertyListFile(put("list", bytes));
    EXPECT_EQ(result.value, value);
    EXPECT_TRUE(result.exists);
    EXPECT_EQ(result.error, "");
  }
}

TEST_F(FileReading, TellsAMissingFileFromAnUnreadableOne) {
  EXPECT_EQ(errorOf((folder / "missing").string(), false), "No such file or directory");
  EXPECT_EQ(errorOf((folder / "missing" / "list").string(), false), "No such file or directory");
  EXPECT_EQ(errorOf(put("empty", {}), true),
            "the end of the document is missing in line 1, column 1");
  EXPECT_EQ(errorOf(put("cut", {'b', 'p', 'l', 'i', 's', 't', '0', '0'}), true),
            "cut short at byte 8");
}

TEST_F(FileReading, DoesNotFollowALinkInTheLastPartOfThePath) {
  put("list", *writeBinaryPropertyList(1));
  std::filesystem::create_symlink("list", folder / "link");
  std::filesystem::create_directory_symlink(folder, folder / "here");
  EXPECT_EQ(errorOf((folder / "link").string(), true), "a symbolic link, which is not followed");
  EXPECT_EQ(readPropertyListFile((folder / "here" / "list").string()).value, Value(1));
}

TEST_F(FileReading, TellsTooManyLinksOnTheWayFromALinkAtItsEnd) {
  std::filesystem::create_symlink("loop", folder / "loop");
  EXPECT_EQ(errorOf((folder / "loop" / "list").string(), true),
            "behind more symbolic links than are followed");
  EXPECT_EQ(errorOf((folder / "loop").string(), true), "a symbolic link, which is not followed");
}

// Reads the terminal at `path` in a process without one. 0 when it has none after that.
int readTerminalInASessionOfItsOwn(const std::string& path) {
  const pid_t child = ::fork();
  if (child == 0) {
    if (::setsid() < 0) ::_exit(2);
    const FileReadResult result = readPropertyListFile(path);
    if (result.error != path + ": not a regular file") ::_exit(3);
    ::_exit(::open("/dev/tty", O_RDONLY | O_CLOEXEC) < 0 ? 0 : 1);
  }
  int status = 0;
  EXPECT_EQ(::waitpid(child, &status, 0), child);
  return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

TEST_F(FileReading, DoesNotMakeATerminalTheProcesssOwn) {
  const int terminal = ::posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
  if (terminal < 0) GTEST_SKIP() << "there are no terminals here";
  ASSERT_EQ(::grantpt(terminal), 0);
  ASSERT_EQ(::unlockpt(terminal), 0);
  EXPECT_EQ(readTerminalInASessionOfItsOwn(::ptsname(terminal)), 0);
  ::close(terminal);
}

TEST_F(FileReading, DoesNotWaitForAPipeNorReadAnythingButAFile) {
  ASSERT_EQ(::mkfifo((folder / "pipe").c_str(), 0600), 0);
  EXPECT_EQ(errorOf((folder / "pipe").string(), true), "not a regular file");
  EXPECT_EQ(errorOf(folder.string(), true), "not a regular file");
  EXPECT_EQ(errorOf("/dev/null", true), "not a regular file");
}

TEST_F(FileReading, RefusesAFileAboveTheLimitWithoutReadingIt) {
  const std::string path = put("large", {});
  std::filesystem::resize_file(path, std::uintmax_t{10} << 30U);
  EXPECT_EQ(errorOf(path, true), "larger than the 256 MiB that are read");
}

TEST_F(FileReading, ReadsAFileToItsEndWhateverSizeIsReported) {
  // The kernel's files have a size of 0 and contents all the same.
  struct stat status {};
  ASSERT_EQ(::stat("/proc/self/status", &status), 0);
  ASSERT_EQ(status.st_size, 0);
  EXPECT_EQ(errorOf("/proc/self/status", true), "text outside of a value in line 1, column 1");
}

TEST_F(FileReading, DoesNotCutThePathAtANUL) {
  const std::string path = put("list", *writeBinaryPropertyList(1));
  EXPECT_EQ(errorOf(path + '\0' + "x", false), "Invalid argument");
}

class RepeatedFileReading : public FileReading {
 protected:
  Dictionary read(const std::string& path) {
    const FileReadResult result = reading.readPropertyListFile(path);
    EXPECT_TRUE(result.exists);
    EXPECT_EQ(result.error, "");
    return result.value ? *result.value->asDictionary() : Dictionary();
  }
  RepeatedReading reading;
};

TEST_F(RepeatedFileReading, GivesTheSameStorageForTheSameBytes) {
  const std::string path = put("list", *writeBinaryPropertyList(Value(Dictionary{{"a", 1}})));
  const Dictionary first = read(path);
  EXPECT_EQ(first, (Dictionary{{"a", 1}}));
  EXPECT_TRUE(read(path).sharesStorageWith(first));
  Dictionary changed = read(path);
  changed.set("a", 2);
  EXPECT_EQ(read(path), (Dictionary{{"a", 1}}));
}

TEST_F(RepeatedFileReading, SeesWhatWasWrittenMeanwhileAlsoInPlace) {
  const std::string path = put("list", *writeBinaryPropertyList(Value(Dictionary{{"a", 1}})));
  const auto time = std::filesystem::last_write_time(path);
  read(path);
  put("list", *writeBinaryPropertyList(Value(Dictionary{{"a", 2}})));
  std::filesystem::last_write_time(path, time);
  EXPECT_EQ(read(path), (Dictionary{{"a", 2}}));
  std::filesystem::remove(path);
  EXPECT_FALSE(reading.readPropertyListFile(path).exists);
  put("list", {'n', 'o', 'n', 'e'});
  EXPECT_EQ(reading.readPropertyListFile(path).value, std::nullopt);
  put("list", *writeBinaryPropertyList(Value(Dictionary{{"a", 2}})));
  EXPECT_EQ(read(path), (Dictionary{{"a", 2}}));
}

TEST_F(RepeatedFileReading, KeepsNoListAboveItsLimit) {
  const Dictionary large{{"a", std::string(RepeatedReading::kMaximumKeptSize, 'a')}};
  const std::string path = put("list", *writeBinaryPropertyList(Value(large)));
  const Dictionary first = read(path);
  EXPECT_EQ(first, large);
  EXPECT_FALSE(read(path).sharesStorageWith(first));
}

TEST_F(FileReading, LeavesNoDescriptorOpen) {
  const auto descriptors = [] {
    std::size_t count = 0;
    for ([[maybe_unused]] const auto& entry :
         std::filesystem::directory_iterator("/proc/self/fd")) {
      ++count;
    }
    return count;
  };
  const std::string path = put("list", *writeBinaryPropertyList(1));
  const std::size_t before = descriptors();
  readPropertyListFile(path);
  readPropertyListFile(folder.string());
  readPropertyListFile(put("bad", {1, 2, 3}));
  EXPECT_EQ(descriptors(), before);
}

}  // namespace
}  // namespace propertylist
