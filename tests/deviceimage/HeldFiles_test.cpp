// What somebody puts in a journal's place leads SQLite to nothing outside of the image.
#include "deviceimage/HeldFiles.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/stat.h>

#include <fstream>

#include "deviceimage/Descriptor.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using testing::HasSubstr;

std::string bigEndian(std::uint32_t number) {
  std::string bytes;
  for (const unsigned shift : {24U, 16U, 8U, 0U})
    bytes += static_cast<char>(static_cast<unsigned char>(number >> shift));
  return bytes;
}

class JournalsPlace : public testing::Test {
 protected:
  JournalsPlace() {
    EXPECT_TRUE(image.stores()
                    .addRecords(Dataclass::contacts, "x", std::vector{record("a", "Ada")})
                    .status.isSuccess());
    std::ofstream(outside) << "kept";
  }

  // A journal of no pages, which a transaction over this and the other file left.
  void writeJournalThatNames(const std::string& name) const {
    constexpr const char* kMagic = "\xD9\xD5\x05\xF9\x20\xA1\x63\xD7";
    constexpr std::uint32_t kSectorSize = 512;
    constexpr std::uint32_t kPageSize = 4096;
    const auto pages = static_cast<std::uint32_t>(std::filesystem::file_size(database) / kPageSize);
    std::string bytes = kMagic + bigEndian(0) + bigEndian(0) + bigEndian(pages) +
                        bigEndian(kSectorSize) + bigEndian(kPageSize);
    bytes.resize(kSectorSize);
    std::uint32_t sum = 0;
    for (const char c : name) sum += static_cast<std::uint32_t>(c);
    bytes += bigEndian(0) + name + bigEndian(static_cast<std::uint32_t>(name.size())) +
             bigEndian(sum) + kMagic;
    std::ofstream(journal, std::fstream::binary) << bytes;
  }

  void expectRefused() const {
    const RecordStores::Stores listed = image.stores().listStores(Dataclass::contacts);
    ASSERT_EQ(listed.status.code, SQLITE_CANTOPEN);
    EXPECT_THAT(listed.status.error->description, HasSubstr("Contacts.sqlite"));
    EXPECT_THAT(listed.status.error->description,
                HasSubstr("cannot be reached, or is none of its own; keep it"));
    EXPECT_FALSE(image.stores().ensureStore(Dataclass::contacts, "y").isSuccess());
  }

  const TemporaryImage image;
  const std::filesystem::path outside = image.directory.path / "outside";
  const std::filesystem::path database =
      image.path(DeviceImage::databaseFile(platform::ContactsSyncType));
  const std::filesystem::path journal = database.string() + "-journal";
};

TEST_F(JournalsPlace, MayHoldAJournalThatIsRolledBack) {
  writeJournalThatNames("");
  EXPECT_TRUE(image.stores().ensureStore(Dataclass::contacts, "y").isSuccess());
  EXPECT_FALSE(std::filesystem::exists(journal));
}

TEST_F(JournalsPlace, HasNothingOutsideDeletedThatAJournalNames) {
  writeJournalThatNames(outside.string());
  expectRefused();
  EXPECT_EQ(textOf(outside), "kept");
  EXPECT_TRUE(std::filesystem::exists(journal));
}

TEST_F(JournalsPlace, HasNothingOutsideLookedForThatAJournalNames) {
  writeJournalThatNames((image.directory.path / "missing").string());
  expectRefused();
}

TEST_F(JournalsPlace, HasNoOtherFileOfTheImageDeletedThatAJournalNames) {
  const Descriptor held(::open(database.parent_path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  const std::filesystem::path other = database.parent_path() / "other";
  std::ofstream(other) << "kept";
  for (const char* const name : {"other", "missing"}) {
    writeJournalThatNames(heldPath(held.number(), name));
    expectRefused();
    EXPECT_EQ(textOf(other), "kept");
    EXPECT_TRUE(std::filesystem::exists(journal));
  }
}

TEST_F(JournalsPlace, MayNotHoldAJournalOfAnotherMode) {
  std::ofstream(database.string() + "-wal") << "no journal at all, but not empty";
  expectRefused();
  EXPECT_FALSE(std::filesystem::exists(database.string() + "-shm"));
}

TEST_F(JournalsPlace, MayNotHoldAJournalWhenThereIsNoDatabase) {
  writeJournalThatNames("");
  std::filesystem::remove(database);
  const platform::Status made = image.stores().ensureStore(Dataclass::contacts, "y");
  ASSERT_EQ(made.code, SQLITE_CANTOPEN);
  EXPECT_THAT(made.error->description, HasSubstr("put the database back"));
  EXPECT_FALSE(std::filesystem::exists(database));
  EXPECT_TRUE(std::filesystem::exists(journal));
}

TEST_F(JournalsPlace, IsNotWaitedForWhenItIsAFIFO) {
  ASSERT_EQ(::mkfifo(journal.c_str(), 0600), 0);
  expectRefused();
}

TEST_F(JournalsPlace, IsTheSameAsALinkWhetherOrNotItLeadsToSomething) {
  std::filesystem::create_symlink(outside, journal);
  expectRefused();
  std::filesystem::remove(outside);
  expectRefused();
}

TEST(HeldFiles, AreNamedByADescriptorAndAPlainName) {
  const TemporaryImage image;
  const Descriptor held(::open(image.path("tmp").c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  std::ofstream(image.path("tmp/file-journal")) << "x";
  sqlite3_vfs& files = *sqlite3_vfs_find(wayToHeldFiles());
  const auto answerFor = [&files](const std::string& path) {
    int answer = -1;
    const int code = files.xAccess(&files, path.c_str(), SQLITE_ACCESS_EXISTS, &answer);
    return code == SQLITE_OK ? answer : -1;
  };
  const std::string directory = "/proc/self/fd/" + std::to_string(held.number());
  EXPECT_EQ(heldPath(held.number(), "file-journal"), directory + "/file-journal");
  EXPECT_EQ(answerFor(directory + "/file-journal"), 1);
  EXPECT_EQ(answerFor(directory + "/missing-wal"), 0);
  for (const std::string& path :
       {std::string("/proc/self/fd/-100/etc/passwd"), directory + "//etc/passwd",
        directory + "/../tmp/file-journal", directory + "/..", directory + "/", directory,
        std::string("/proc/self/fd/"), std::string("/proc/self/fd/99999999999999/file-journal"),
        image.path("tmp/file-journal").string(), std::string("file-journal"), std::string()}) {
    EXPECT_EQ(answerFor(path), -1) << path;
    EXPECT_NE(files.xDelete(&files, path.c_str(), 0), SQLITE_OK) << path;
  }
  EXPECT_EQ(textOf(image.path("tmp/file-journal")), "x");
}

}  // namespace
}  // namespace deviceimage
