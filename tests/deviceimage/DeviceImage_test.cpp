// The directory itself: what is made, with which modes, and that no name leads outside.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <fstream>

#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::Field;
using testing::HasSubstr;
using testing::IsEmpty;

std::span<const std::uint8_t> bytesOf(std::string_view text) {
  return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

// Everything in the image that somebody else than its owner could use.
std::vector<std::string> publicPathsIn(const std::filesystem::path& root) {
  std::vector<std::string> paths;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(root)) {
    struct stat status {};
    if (::lstat(entry.path().c_str(), &status) != 0) continue;
    const mode_t expected = S_ISDIR(status.st_mode) ? 0700 : 0600;
    if ((status.st_mode & 07777) != expected) paths.push_back(entry.path().string());
  }
  return paths;
}

TEST(DeviceImage, HasItsDirectoriesUsersAndAnEmptySettingsFileWhenItIsNew) {
  const TemporaryImage made;
  for (const char* directory :
       {"tmp", "System/Library/DataClassMigrators", "var/mobile/Library/Preferences"})
    EXPECT_TRUE(std::filesystem::is_directory(made.path(directory))) << directory;
  const propertylist::Value settings =
      propertylist::Dictionary{{"Version", 12}, {"Accounts", propertylist::Array()}};
  EXPECT_EQ(made.image->readPropertyList(DeviceImage::kSettingsFile).value, settings);
  EXPECT_THAT(made.image->checkFiles(), IsEmpty());
}

TEST(DeviceImage, MapsMobileToItsMakerOrForRootToAnUnprivilegedNumber) {
  const TemporaryImage made;
  const bool isRoot = ::geteuid() == 0;
  EXPECT_EQ(made.image->userNumber("mobile"), isRoot ? 501 : ::geteuid());
  EXPECT_EQ(made.image->groupNumber("mobile"), isRoot ? 501 : ::getegid());
  struct stat status {};
  ASSERT_EQ(::stat(made.image->settingsFile().c_str(), &status), 0);
  EXPECT_EQ(status.st_uid, isRoot ? 501 : ::geteuid());
  EXPECT_EQ(made.image->userNumber("501"), std::nullopt);
  for (const char* name : {"mob", "mobile:", "mobile:*", ""})
    EXPECT_EQ(made.image->userNumber(name), std::nullopt) << name;
}

TEST(DeviceImage, ReadsUsersFromItsOwnFileAndNoNumberFromADamagedLine) {
  const TemporaryImage made;
  const auto write = [&](const char* text) {
    ASSERT_TRUE(made.image->writeFile(DeviceImage::kUsersFile, bytesOf(text)).isSuccess());
  };
  write("mobile2:*:7:7::/:\nmobile:*:1234:5::/:\n");
  EXPECT_EQ(made.image->userNumber("mobile"), 1234U);
  for (const char* text :
       {"", "mobile", "mobile:", "mobile:*", "mobile:*:", "mobile:*:x:", "mobile:*:1x",
        "mobile:*:-1:", "mobile:*:99999999999:", "root:*:0:0::/:\n"}) {
    write(text);
    EXPECT_EQ(made.image->userNumber("mobile"), std::nullopt) << text;
  }
}

TEST(DeviceImage, IsPrivateUnderAnyFileCreationMask) {
  const mode_t before = ::umask(0);
  const TemporaryImage made;
  RecordStores stores = made.stores();
  ASSERT_TRUE(stores.addRecords(Dataclass::contacts, std::nullopt, std::vector{record("a", "Ada")})
                  .status.isSuccess());
  EXPECT_THAT(publicPathsIn(made.root()), IsEmpty());
  ::umask(before);
}

TEST(DeviceImage, IsMadeInAnEmptyDirectoryAndInNoOther) {
  const TemporaryDirectory directory;
  const std::string path = (directory.path / "image").string();
  std::filesystem::create_directory(path);
  std::filesystem::permissions(path, std::filesystem::perms{0755});
  ASSERT_NE(DeviceImage::create(path).image, nullptr);
  EXPECT_EQ(std::filesystem::status(path).permissions(), std::filesystem::perms{0700});
  EXPECT_THAT(DeviceImage::create(path).error, HasSubstr("is there already"));
  EXPECT_THAT(DeviceImage::create((directory.path / "no/such").string()).error,
              HasSubstr("cannot make the directory"));
}

TEST(DeviceImage, IsOpenedThroughALinkButNotWhereThereIsNone) {
  const TemporaryImage made;
  std::filesystem::create_directory_symlink(made.root(), made.directory.path / "link");
  const OpenedImage opened = DeviceImage::open((made.directory.path / "link").string());
  ASSERT_NE(opened.image, nullptr);
  EXPECT_EQ(opened.image->rootPath(), std::filesystem::canonical(made.root()));
  EXPECT_THAT(DeviceImage::open(made.directory.path.string()).error,
              HasSubstr("is no device image"));
  EXPECT_THAT(DeviceImage::open("/no/such").error, HasSubstr("cannot open the device image"));
  EXPECT_THAT(DeviceImage::open("").error, HasSubstr("cannot open the device image"));
}

TEST(DeviceImage, RefusesNamesThatCouldLeadOutside) {
  const TemporaryImage made;
  const std::string names[] = {"../x",   "tmp/../../x", "..", ".",  "",
                               "/../x",  "tmp//x",      "/",  "//", std::string("a\0b", 3),
                               "tmp/./x"};
  for (const std::string& name : names) {
    SCOPED_TRACE(name);
    EXPECT_EQ(made.image->openFile(name, O_RDONLY).status.code, EINVAL);
    EXPECT_EQ(made.image->writeFile(name, bytesOf("x")).code, EINVAL);
    EXPECT_FALSE(made.image->exists(name));
  }
}

TEST(DeviceImage, FollowsNoLinkThatSomebodyPutsIntoIt) {
  const TemporaryImage made;
  const std::filesystem::path outside = made.directory.path / "outside";
  std::filesystem::create_directory(outside);
  std::ofstream(outside / "secret.plist") << "secret";
  std::filesystem::create_directory_symlink(outside, made.path("tmp/folder"));
  std::filesystem::create_symlink(outside / "secret.plist", made.path("tmp/file"));
  EXPECT_EQ(made.image->openFile("tmp/file", O_RDONLY).status.code, ELOOP);
  EXPECT_NE(made.image->openFile("tmp/folder/secret.plist", O_RDONLY).status.code, 0);
  EXPECT_NE(made.image->openFile("tmp/folder/new", O_WRONLY | O_CREAT).status.code, 0);
  EXPECT_NE(made.image->makeDirectory("tmp/folder/new").code, 0);
  EXPECT_NE(made.image->removeFile("tmp/folder/secret.plist").code, 0);
  EXPECT_NE(made.image->createFile("tmp/file", bytesOf("x")).code, 0);
  EXPECT_THAT(made.image->namesIn("tmp/folder"), IsEmpty());
  EXPECT_EQ(made.image->lookAt("tmp/file").kind, FileLook::Kind::other);
  EXPECT_EQ(made.image->lookAt("tmp/folder/secret.plist").kind, FileLook::Kind::other);
  // What replaces a file replaces the link, not what it leads to.
  EXPECT_EQ(made.image->writeFile("tmp/file", bytesOf("x")).code, 0);
  EXPECT_EQ(textOf(outside / "secret.plist"), "secret");
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(outside), {}), 1);
}

TEST(DeviceImage, WaitsForNoFIFOAndOpensNoDirectoryAsAFile) {
  const TemporaryImage made;
  ASSERT_EQ(::mkfifo(made.path("tmp/fifo").c_str(), 0600), 0);
  EXPECT_EQ(made.image->openFile("tmp/fifo", O_RDONLY).status.code, EINVAL);
  EXPECT_NE(made.image->openFile("var", O_RDONLY).status.code, 0);
}

TEST(DeviceImage, ReplacesAFileInOneStepAndCreatesOnlyWhatIsNotThere) {
  const TemporaryImage made;
  EXPECT_EQ(made.image->createFile("tmp/new", bytesOf("one")).code, 0);
  EXPECT_EQ(made.image->createFile("tmp/new", bytesOf("two")).code, EEXIST);
  EXPECT_EQ(textOf(made.path("tmp/new")), "one");
  EXPECT_EQ(made.image->writeFile("tmp/new", bytesOf("three")).code, 0);
  EXPECT_EQ(textOf(made.path("tmp/new")), "three");
  EXPECT_THAT(made.image->namesIn("tmp"), ElementsAre("new"));
}

TEST(DeviceImage, RemovesWhatAKilledProgramLeft) {
  const TemporaryImage made;
  std::ofstream(
      made.path("var/mobile/Library/Preferences/.new-77-com.vantor.accountsettings.plist"))
      << "x";
  std::ofstream(made.path("var/mobile/Library/Preferences/com.example.plist")) << "x";
  made.image->removeLeftovers();
  EXPECT_THAT(made.image->namesIn(DeviceImage::kPreferencesDirectory),
              ElementsAre("com.example.plist", "com.vantor.accountsettings.plist"));
}

TEST(DeviceImage, NamesNoPreferencesOutsideTheirDirectory) {
  EXPECT_EQ(DeviceImage::preferencesFile("com.vantor.OTASyncAgent"),
            "var/mobile/Library/Preferences/com.vantor.OTASyncAgent.plist");
  for (const std::string& name : {std::string("../x"), std::string("a/b"), std::string(),
                                  std::string(".."), std::string("a\0b", 3), std::string(300, 'a')})
    EXPECT_EQ(DeviceImage::preferencesFile(name), std::nullopt) << name;
}

TEST(DeviceImage, SaysWhatIsWrongWithItsFiles) {
  const auto about = [](const char* path) { return Contains(Field(&ImageProblem::path, path)); };
  const TemporaryImage made;
  std::filesystem::permissions(made.image->settingsFile(), std::filesystem::perms{0644});
  std::filesystem::create_symlink("/etc", made.path("tmp/link"));
  std::filesystem::remove(made.path("etc/group"));
  std::filesystem::remove_all(made.path("var/mobile/Library/Notes"));
  std::ofstream(made.path("System/Library/DeviceProperties.plist")) << "no list";
  const std::vector<ImageProblem> problems = made.image->checkFiles();
  EXPECT_THAT(problems, about("var/mobile/Library/Preferences/com.vantor.accountsettings.plist"));
  EXPECT_THAT(problems, about("tmp/link"));
  EXPECT_THAT(problems, about("etc/group"));
  EXPECT_THAT(problems, about("var/mobile/Library/Notes"));
  EXPECT_THAT(problems, about("System/Library/DeviceProperties.plist"));
  EXPECT_EQ(problems.size(), 5U);
}

}  // namespace
}  // namespace deviceimage
