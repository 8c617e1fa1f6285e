#pragma once

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "platform/FileServices.h"
#include "propertylist/Writing.h"
#include "tests/contracts/Port.h"

// One service with an empty directory to work in.
class FileServicesUnderTest {
 public:
  virtual ~FileServicesUnderTest() = default;
  virtual platform::FileServices& service() = 0;
  virtual std::string directory() = 0;
};
using FileServicesPort = Port<FileServicesUnderTest>;

class FileServicesContract : public Contract<FileServicesUnderTest> {
 protected:
  platform::FileServices& service() { return device->service(); }
  std::string path(const std::string& name) { return device->directory() + "/" + name; }

  static void write(const std::string& path, const std::string& text) {
    std::ofstream(path, std::fstream::binary) << text;
  }
  static std::string read(const std::string& path) {
    std::ifstream file(path, std::fstream::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }
  static unsigned modeOf(const std::string& path) {
    struct stat status = {};
    EXPECT_EQ(::lstat(path.c_str(), &status), 0) << path;
    return status.st_mode & ALLPERMS;
  }
  static std::span<const std::uint8_t> bytesOf(const std::string& text) {
    return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
  }
};

TEST_P(FileServicesContract, ReadsAPropertyList) {
  const auto bytes = propertylist::writeBinaryPropertyList(propertylist::Dictionary{{"a", 1}});
  write(path("list"), std::string(bytes->begin(), bytes->end()));
  const auto read = service().readPropertyListFile(path("list"));
  EXPECT_EQ(read.value, propertylist::Value(propertylist::Dictionary{{"a", 1}}));
  EXPECT_TRUE(read.exists);
  EXPECT_EQ(read.error, "");
}

TEST_P(FileServicesContract, TellsAMissingFileFromAnUnreadableOne) {
  const auto missing = service().readPropertyListFile(path("missing"));
  EXPECT_FALSE(missing.exists);
  EXPECT_FALSE(missing.value.has_value());
  EXPECT_NE(missing.error, "");
  write(path("broken"), "bplist00 but not really");
  const auto broken = service().readPropertyListFile(path("broken"));
  EXPECT_TRUE(broken.exists);
  EXPECT_FALSE(broken.value.has_value());
  EXPECT_NE(broken.error, "");
}

TEST_P(FileServicesContract, SeesFilesAndDirectoriesAndWhereLinksLead) {
  write(path("file"), "");
  std::filesystem::create_symlink(path("file"), path("link"));
  std::filesystem::create_symlink(path("nowhere"), path("dangling"));
  EXPECT_TRUE(service().fileExists(path("file")));
  EXPECT_TRUE(service().fileExists(device->directory()));
  EXPECT_TRUE(service().fileExists(path("link")));
  EXPECT_FALSE(service().fileExists(path("dangling")));
  EXPECT_FALSE(service().fileExists(path("missing")));
  EXPECT_FALSE(service().fileExists(path("file/below")));
}

TEST_P(FileServicesContract, NamesTemporaryFilesThatAreNotThere) {
  const auto name = service().temporaryFileName();
  ASSERT_TRUE(name.has_value());
  EXPECT_TRUE(name->starts_with("/")) << *name;
  EXPECT_FALSE(service().fileExists(*name));
}

TEST_P(FileServicesContract, WritesAFileThatOnlyItsOwnerCanOpen) {
  const std::string text(300'000, 'x');
  const mode_t former = ::umask(0);
  const auto created = service().createPrivateFile(path("file"));
  ::umask(former);
  ASSERT_TRUE(created.status.isSuccess());
  EXPECT_EQ(modeOf(path("file")), 0600U);
  EXPECT_TRUE(service().writeAll(created.descriptor, bytesOf(text)).isSuccess());
  EXPECT_TRUE(service().writeAll(created.descriptor, {}).isSuccess());
  EXPECT_TRUE(service().setOwner(created.descriptor, ::geteuid(), ::getegid()).isSuccess());
  EXPECT_TRUE(service().makePrivate(created.descriptor).isSuccess());
  EXPECT_TRUE(service().synchronizeFile(created.descriptor).isSuccess());
  EXPECT_TRUE(service().closeFile(created.descriptor).isSuccess());
  EXPECT_EQ(read(path("file")), text);
  EXPECT_EQ(modeOf(path("file")), 0600U);
}

TEST_P(FileServicesContract, CreatesNothingWhereAnythingIs) {
  write(path("file"), "old");
  std::filesystem::create_directory(path("directory"));
  std::filesystem::create_symlink(path("target"), path("dangling"));
  for (const char* taken : {"file", "directory", "dangling"}) {
    SCOPED_TRACE(taken);
    const auto created = service().createPrivateFile(path(taken));
    EXPECT_EQ(created.status.code, EEXIST);
    EXPECT_EQ(created.descriptor, -1);
  }
  EXPECT_EQ(read(path("file")), "old");
  EXPECT_FALSE(service().fileExists(path("target")));
}

TEST_P(FileServicesContract, FailsWithTheReasonOnADescriptorThatIsNotOpen) {
  const std::string text = "x";
  EXPECT_EQ(service().writeAll(-1, bytesOf(text)).code, EBADF);
  EXPECT_EQ(service().setOwner(-1, 0, 0).code, EBADF);
  EXPECT_EQ(service().makePrivate(-1).code, EBADF);
  EXPECT_EQ(service().synchronizeFile(-1).code, EBADF);
  EXPECT_EQ(service().checkName(-1, path("file")).code, EBADF);
  const platform::Status closed = service().closeFile(-1);
  EXPECT_EQ(closed.code, EBADF);
  EXPECT_TRUE(closed.error.has_value());
}

TEST_P(FileServicesContract, NoticesWhenANameIsNoLongerThatOfTheOpenFile) {
  const auto created = service().createPrivateFile(path("file"));
  ASSERT_TRUE(created.status.isSuccess());
  EXPECT_TRUE(service().checkName(created.descriptor, path("file")).isSuccess());
  std::filesystem::rename(path("file"), path("moved"));
  EXPECT_EQ(service().checkName(created.descriptor, path("file")).code, ENOENT);
  write(path("file"), "");
  EXPECT_EQ(service().checkName(created.descriptor, path("file")).code, ESTALE);
  std::filesystem::remove(path("file"));
  std::filesystem::create_symlink(path("moved"), path("file"));
  EXPECT_EQ(service().checkName(created.descriptor, path("file")).code, ESTALE);
  EXPECT_TRUE(service().closeFile(created.descriptor).isSuccess());
}

TEST_P(FileServicesContract, PutsOneFileInThePlaceOfAnother) {
  write(path("new"), "new");
  write(path("old"), "old");
  EXPECT_TRUE(service().renameFileToFile(path("new"), path("old")).isSuccess());
  EXPECT_TRUE(service().synchronizeDirectoryOfFile(path("old")).isSuccess());
  EXPECT_EQ(read(path("old")), "new");
  EXPECT_FALSE(service().fileExists(path("new")));
  EXPECT_EQ(service().renameFileToFile(path("new"), path("old")).code, ENOENT);
  EXPECT_EQ(service().synchronizeDirectoryOfFile(path("no/such")).code, ENOENT);
}

TEST_P(FileServicesContract, RemovesAFile) {
  write(path("file"), "x");
  EXPECT_TRUE(service().removeFile(path("file")).isSuccess());
  EXPECT_FALSE(service().fileExists(path("file")));
  EXPECT_EQ(service().removeFile(path("file")).code, ENOENT);
}

TEST_P(FileServicesContract, KeepsAnUnreadableFileUnderTheFirstFreeName) {
  write(path("settings"), "first");
  std::filesystem::permissions(path("settings"), std::filesystem::perms(0644));
  EXPECT_TRUE(service().setAsideUnreadableFile(path("settings")).isSuccess());
  EXPECT_EQ(read(path("settings")), "first");
  EXPECT_EQ(read(path("settings.unreadable-1")), "first");
  EXPECT_EQ(modeOf(path("settings.unreadable-1")), 0600U);

  write(path("replacement"), "second");
  EXPECT_TRUE(service().renameFileToFile(path("replacement"), path("settings")).isSuccess());
  EXPECT_TRUE(service().setAsideUnreadableFile(path("settings")).isSuccess());
  EXPECT_EQ(read(path("settings.unreadable-1")), "first");
  EXPECT_EQ(read(path("settings.unreadable-2")), "second");
}

TEST_P(FileServicesContract, HasNothingToKeepWhereNothingIs) {
  EXPECT_TRUE(service().setAsideUnreadableFile(path("settings")).isSuccess());
  EXPECT_TRUE(std::filesystem::is_empty(device->directory()));
}
