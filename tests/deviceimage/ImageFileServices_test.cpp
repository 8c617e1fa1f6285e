// The files that a process reads and writes by whole paths: none outside the image by way of a link
// in it.
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "deviceimage/DeviceImageServices.h"
#include "deviceimage/ImageFileServices.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using testing::HasSubstr;
using testing::Not;

// An image whose preferences are a link to a directory outside that holds settings.
class FilesOfAnImageWithALink : public testing::Test {
 protected:
  FilesOfAnImageWithALink() {
    std::filesystem::rename(made.path(DeviceImage::kPreferencesDirectory), outside);
    std::filesystem::create_directory_symlink(outside,
                                              made.path(DeviceImage::kPreferencesDirectory));
  }
  int countOutside() const {
    return static_cast<int>(std::distance(std::filesystem::directory_iterator(outside), {}));
  }

  TemporaryImage made;
  std::filesystem::path outside = made.directory.path / "outside";
  ImageFileServices files{made.image};
  std::string settings = made.image->settingsFile();
};

TEST_F(FilesOfAnImageWithALink, AreNotRead) {
  const propertylist::FileReadResult read = files.readPropertyListFile(settings);
  EXPECT_FALSE(read.value);
  EXPECT_TRUE(read.exists);
  EXPECT_THAT(read.error, HasSubstr("var/mobile/Library/Preferences/com.vantor.accountsettings"));
  EXPECT_FALSE(files.fileExists(settings));
}

TEST_F(FilesOfAnImageWithALink, AreNotCreated) {
  const auto created = files.createPrivateFile(settings + ".new");
  EXPECT_EQ(created.status.code, ENOTDIR);
  EXPECT_EQ(created.descriptor, -1);
  EXPECT_EQ(countOutside(), 1);
}

TEST_F(FilesOfAnImageWithALink, AreNotReplacedNorSetAsideNorRemoved) {
  const std::string temporary = made.image->temporaryDirectory() + "/new";
  std::ofstream(temporary) << "new";
  EXPECT_EQ(files.renameFileToFile(temporary, settings).code, ENOTDIR);
  EXPECT_EQ(files.renameFileToFile(settings, temporary).code, ENOTDIR);
  EXPECT_EQ(files.setAsideUnreadableFile(settings).code, ENOTDIR);
  EXPECT_EQ(files.removeFile(settings).code, ENOTDIR);
  EXPECT_EQ(files.synchronizeDirectoryOfFile(settings).code, ENOTDIR);
  EXPECT_EQ(countOutside(), 1);
  EXPECT_TRUE(std::filesystem::exists(outside / "com.vantor.accountsettings.plist"));
}

TEST(ImageFileServices, RefuseAPathThatClimbsOutOfTheImage) {
  const TemporaryImage made;
  ImageFileServices files(made.image);
  const std::string path = made.image->rootPath() + "/tmp/../../outside";
  EXPECT_EQ(files.createPrivateFile(path).status.code, EINVAL);
  EXPECT_FALSE(std::filesystem::exists(made.directory.path / "outside"));
}

TEST(ImageFileServices, TakePathsOutsideTheImageAsTheyAre) {
  const TemporaryImage made;
  ImageFileServices files(made.image);
  const std::string path = (made.directory.path / "outside").string();
  const auto created = files.createPrivateFile(path);
  EXPECT_TRUE(files.closeFile(created.descriptor).isSuccess());
  EXPECT_TRUE(files.fileExists(path));
}

TEST(ImageFileServices, RemoveTheirNewFileAlsoWhenNothingCanBeOpenedAnyMore) {
  const TemporaryImage made;
  ImageFileServices files(made.image);
  const std::string path = made.image->temporaryDirectory() + "/new";
  ASSERT_TRUE(files.closeFile(files.createPrivateFile(path).descriptor).isSuccess());
  // A sanitizer looks at a type, the first time it meets it, through a pipe.
  ASSERT_EQ(files.removeFile(path + "er").code, ENOENT);
  rlimit before = {};
  ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &before), 0);
  const rlimit none = {0, before.rlim_max};
  ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &none), 0);
  EXPECT_EQ(files.removeFile(made.image->settingsFile()).code, EMFILE);
  EXPECT_TRUE(files.removeFile(path).isSuccess());
  ASSERT_EQ(::setrlimit(RLIMIT_NOFILE, &before), 0);
  EXPECT_FALSE(std::filesystem::exists(path));
}

TEST(ImageFileServices, HoldNoDirectoryOfAFileThatWasMovedOrRemoved) {
  const TemporaryImage made;
  ImageFileServices files(made.image);
  const std::string path = made.image->temporaryDirectory() + "/new";
  const auto descriptors = [] {
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
  };
  const auto before = descriptors();
  ASSERT_TRUE(files.closeFile(files.createPrivateFile(path).descriptor).isSuccess());
  ASSERT_TRUE(files.renameFileToFile(path, path + "er").isSuccess());
  EXPECT_EQ(descriptors(), before);
  ASSERT_TRUE(files.closeFile(files.createPrivateFile(path).descriptor).isSuccess());
  ASSERT_TRUE(files.removeFile(path).isSuccess());
  EXPECT_EQ(descriptors(), before);
}

TEST(ImageFileServices, NameThePathThatTheyWereAskedFor) {
  const TemporaryImage made;
  ImageFileServices files(made.image);
  const std::string path = made.image->temporaryDirectory() + "/broken.plist";
  std::ofstream(path) << "bplist00 and no more";
  EXPECT_THAT(files.readPropertyListFile(path).error, HasSubstr(path + ": "));
  const std::string missing = made.image->temporaryDirectory() + "/missing";
  const platform::Status removed = files.removeFile(missing);
  EXPECT_THAT(removed.error->description, HasSubstr(missing));
  EXPECT_THAT(removed.error->description, Not(HasSubstr("/proc/")));
}

}  // namespace
}  // namespace deviceimage
