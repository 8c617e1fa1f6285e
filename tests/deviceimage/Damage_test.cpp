// Databases that cannot be used are refused with a clear text and left as they are.
#include <gmock/gmock.h>
#include <sqlite3.h>

#include <fstream>

#include "deviceimage/Database.h"
#include "deviceimage/DeviceImageServices.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using testing::HasSubstr;

void writeText(const std::filesystem::path& path, const std::string& text) {
  std::ofstream(path, std::fstream::binary | std::fstream::trunc) << text;
}

// Does something to a database as another program would.
void runSQL(const std::filesystem::path& path, const std::string& sql) {
  sqlite3* database = nullptr;
  ASSERT_EQ(sqlite3_open(path.c_str(), &database), SQLITE_OK);
  EXPECT_EQ(sqlite3_exec(database, sql.c_str(), nullptr, nullptr, nullptr), SQLITE_OK)
      << sqlite3_errmsg(database);
  sqlite3_close(database);
}

struct DamageCase {
  const char* name;
  void (*damage)(const std::filesystem::path& database);
  const char* expectedText;
};

class DamagedDatabase : public testing::TestWithParam<DamageCase> {};

TEST_P(DamagedDatabase, IsRefusedByEveryOperationAndLeftAsItIs) {
  const TemporaryImage image;
  ASSERT_TRUE(image.stores()
                  .addRecords(Dataclass::contacts, "x", std::vector{record("a", "Ada")})
                  .status.isSuccess());
  const std::filesystem::path path =
      image.path(DeviceImage::databaseFile(platform::ContactsSyncType));
  GetParam().damage(path);
  const std::string before = textOf(path);

  DeviceImageServices made(image.image);
  platform::SyncDataSource& sources = made.services().syncDataSource;
  for (const std::optional<std::string>& account : {std::optional<std::string>(), {"x"}}) {
    const auto created = sources.createDataSource("Contacts", account, std::nullopt);
    EXPECT_FALSE(created.status.isSuccess());
    EXPECT_EQ(created.source, nullptr);
    EXPECT_THAT(created.status.error->description, HasSubstr(GetParam().expectedText));
    EXPECT_THAT(created.status.error->description, HasSubstr("Contacts.sqlite"));
  }
  EXPECT_FALSE(
      sources.externalSourcesEnabledForSyncType(platform::ContactsSyncType).status.isSuccess());
  EXPECT_FALSE(sources.setTetheredSyncingDisabled(platform::ContactsSyncType, true).isSuccess());
  EXPECT_EQ(made.services().contactsStore.openAddressBook(), nullptr);
  for (const auto access : {RecordStores::Access::readOnly, RecordStores::Access::readWrite}) {
    RecordStores stores(image.image, access);
    EXPECT_FALSE(stores.listStores().status.isSuccess());
    EXPECT_FALSE(stores.addRecords(Dataclass::contacts, "x", std::vector{record("b", "Bo")})
                     .status.isSuccess());
  }
  EXPECT_NE(databaseProblems(image), std::vector<std::string>{});
  EXPECT_EQ(textOf(path), before);
  // The other databases are none the worse.
  EXPECT_TRUE(sources.createDataSource("Notes", std::nullopt, std::nullopt).status.isSuccess());
}

INSTANTIATE_TEST_SUITE_P(
    DeviceImage, DamagedDatabase,
    testing::Values(
        DamageCase{"Empty", [](const std::filesystem::path& path) { writeText(path, ""); },
                   "an empty file"},
        DamageCase{"Zeroed",
                   [](const std::filesystem::path& path) {
                     writeText(path, std::string(std::filesystem::file_size(path), '\0'));
                   },
                   "not a database"},
        DamageCase{
            "OtherBytes",
            [](const std::filesystem::path& path) { writeText(path, std::string(9000, 'x')); },
            "not a database"},
        DamageCase{
            "CutShort",
            [](const std::filesystem::path& path) { std::filesystem::resize_file(path, 5000); },
            "malformed"},
        DamageCase{
            "OfANewerVersion",
            [](const std::filesystem::path& path) { runSQL(path, "PRAGMA user_version = 2"); },
            "of version 2, and this program knows versions up to 1; use a newer program"},
        DamageCase{
            "OfAnotherProgram",
            [](const std::filesystem::path& path) { runSQL(path, "PRAGMA application_id = 7"); },
            "belongs to another program"},
        DamageCase{"WithATrigger",
                   [](const std::filesystem::path& path) {
                     runSQL(
                         path,
                         "CREATE TRIGGER t AFTER INSERT ON records BEGIN DELETE FROM stores; END");
                   },
                   "its tables are not those of version 1"},
        DamageCase{"WithoutATable",
                   [](const std::filesystem::path& path) { runSQL(path, "DROP TABLE anchors"); },
                   "its tables are not those of version 1"},
        DamageCase{"WithATriggerCalledLikeItsTable",
                   [](const std::filesystem::path& path) {
                     runSQL(path,
                            "CREATE TRIGGER records AFTER INSERT ON records BEGIN "
                            "DELETE FROM records WHERE id <> new.id; END");
                   },
                   "its tables are not those of version 1"},
        DamageCase{
            "InWriteAheadMode",
            [](const std::filesystem::path& path) { runSQL(path, "PRAGMA journal_mode = WAL"); },
            "write-ahead mode"}),
    [](const auto& instance) { return std::string(instance.param.name); });

TEST(DatabaseFile, HasNoFilesOfTheWriteAheadModeMade) {
  const TemporaryImage image;
  ASSERT_TRUE(image.stores().ensureStore(Dataclass::contacts, "x").isSuccess());
  const std::string path = image.path(DeviceImage::databaseFile(platform::ContactsSyncType));
  runSQL(path, "PRAGMA journal_mode = WAL");
  EXPECT_FALSE(image.stores().ensureStore(Dataclass::contacts, "y").isSuccess());
  EXPECT_FALSE(std::filesystem::exists(path + "-wal"));
  EXPECT_FALSE(std::filesystem::exists(path + "-shm"));
}

TEST(DatabaseFile, IsNeverReachedThroughALink) {
  const TemporaryImage image;
  const TemporaryImage other;
  for (const TemporaryImage* made : {&image, &other})
    ASSERT_TRUE(made->stores().ensureStore(Dataclass::contacts, "x").isSuccess());
  const std::filesystem::path path =
      image.path(DeviceImage::databaseFile(platform::ContactsSyncType));
  const std::filesystem::path target =
      other.path(DeviceImage::databaseFile(platform::ContactsSyncType));
  const std::string before = textOf(target);
  std::filesystem::remove(path);
  std::filesystem::create_symlink(target, path);
  EXPECT_FALSE(image.stores().ensureStore(Dataclass::contacts, "y").isSuccess());
  std::filesystem::remove_all(path.parent_path());
  std::filesystem::create_directory_symlink(target.parent_path(), path.parent_path());
  EXPECT_FALSE(image.stores().ensureStore(Dataclass::contacts, "y").isSuccess());
  EXPECT_EQ(textOf(target), before);
}

TEST(DatabaseFile, IsReachedThroughTheDirectoryThatItWasFoundIn) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  ASSERT_TRUE(stores.ensureStore(Dataclass::contacts, "x").isSuccess());
  const std::filesystem::path directory =
      image.path(DeviceImage::databaseFile(platform::ContactsSyncType)).parent_path();
  const std::filesystem::path outside = image.directory.path / "outside";
  std::filesystem::create_directory(outside);
  std::filesystem::rename(directory, directory.string() + "-moved");
  std::filesystem::create_directory_symlink(outside, directory);

  EXPECT_TRUE(stores.ensureStore(Dataclass::contacts, "y").isSuccess());
  EXPECT_TRUE(std::filesystem::is_empty(outside));
  std::filesystem::remove(directory);
  std::filesystem::rename(directory.string() + "-moved", directory);
  EXPECT_TRUE(image.stores().findStore(Dataclass::contacts, "y").store.has_value());
}

TEST(DatabaseFile, HasAPrivateJournalWhileItIsWritten) {
  const TemporaryImage image;
  const std::unique_ptr<Database> database =
      Database::openOrCreate(*image.image, platform::ContactsSyncType);
  const Transaction transaction(*database);
  execute(*database, "INSERT INTO stores (account) VALUES ('x')");
  const std::filesystem::path path =
      image.path(DeviceImage::databaseFile(platform::ContactsSyncType));
  EXPECT_EQ(std::filesystem::status(path.string() + "-journal").permissions(),
            std::filesystem::perms{0600});
  EXPECT_EQ(std::filesystem::status(path).permissions(), std::filesystem::perms{0600});
}

TEST(DatabaseFile, StaysUntouchedWhenNothingChanges) {
  const TemporaryImage image;
  ASSERT_TRUE(image.stores()
                  .addRecords(Dataclass::contacts, "x", std::vector{record("a", "Ada")})
                  .status.isSuccess());
  DeviceImageServices made(image.image);
  platform::SyncDataSource& sources = made.services().syncDataSource;
  const std::filesystem::path path =
      image.path(DeviceImage::databaseFile(platform::ContactsSyncType));
  std::string before;
  for (int run = 0; run < 2; ++run) {
    const auto local = sources.createDataSource("Contacts", std::nullopt, std::nullopt).source;
    const auto service = sources.createDataSource("Contacts", "x", std::nullopt).source;
    EXPECT_EQ(sources.setTetheredSyncingDisabled(platform::ContactsSyncType, false).code, 0);
    EXPECT_EQ(sources.migrateRecords(service, local).code, 0);
    EXPECT_EQ(sources.commit(local).code, 0);
    EXPECT_EQ(sources.commit(service).code, 0);
    EXPECT_EQ(sources.clearSyncAnchors(local).code, 0);
    const auto book = made.services().contactsStore.openAddressBook();
    made.services().contactsStore.setSourceEnabled(made.services().contactsStore.localSource(book),
                                                   true);
    EXPECT_EQ(made.services().contactsStore.saveAddressBook(book).code, 0);
    if (run == 0) before = textOf(path);
  }
  EXPECT_EQ(textOf(path), before);
}

TEST(DatabaseCheck, FindsAContentThatIsNotWhatItsHashSays) {
  const TemporaryImage image;
  ASSERT_TRUE(image.stores()
                  .addRecords(Dataclass::contacts, "x", std::vector{record("a", "Ada")})
                  .status.isSuccess());
  runSQL(image.path(DeviceImage::databaseFile(platform::ContactsSyncType)),
         "UPDATE records SET content = x'00'");
  EXPECT_THAT(databaseProblems(image),
              testing::ElementsAre("record 1 (\"a\") has another content than its hash says"));
}

TEST(DatabaseCheck, FindsARowWithoutTheOneItRefersTo) {
  const TemporaryImage image;
  ASSERT_TRUE(image.stores()
                  .addRecords(Dataclass::contacts, "x", std::vector{record("a", "Ada")})
                  .status.isSuccess());
  runSQL(image.path(DeviceImage::databaseFile(platform::ContactsSyncType)),
         "DELETE FROM collections");
  EXPECT_THAT(
      databaseProblems(image),
      testing::ElementsAre(
          "row 1 of table \"records\" refers to a row of \"collections\" that is not there"));
}

TEST(ReadOnlyFolders, LeaveTheirNameToNoNewOne) {
  const TemporaryImage image;
  const auto add = [&](const char* uid) {
    return image.stores()
        .addRecords(Dataclass::notes, std::nullopt, std::vector{record(uid, "1")})
        .status.isSuccess();
  };
  ASSERT_TRUE(add("a"));
  runSQL(image.path(DeviceImage::databaseFile(platform::NotesSyncType)),
         "UPDATE collections SET writable = 0, is_default = 0");
  ASSERT_TRUE(add("b"));
  RecordStores stores = image.stores();
  const Row store = stores.findStore(Dataclass::notes, std::nullopt).store->row;
  std::vector<std::string> names;
  for (const Collection& folder : stores.listCollections(Dataclass::notes, store).collections)
    names.push_back(folder.path.front());
  EXPECT_EQ(names, (std::vector<std::string>{"Notes", "Notes 2"}));
}

TEST(FoldersInFolders, FailAListingWhereTheyAreTooDeep) {
  const TemporaryImage image;
  const std::vector<std::string> path(1000, "A");
  ASSERT_TRUE(image.stores()
                  .addRecords(Dataclass::bookmarks, "x", std::vector{record("a", "1", 1, path)})
                  .status.isSuccess());
  RecordStores stores = image.stores();
  const Row store = stores.findStore(Dataclass::bookmarks, "x").store->row;
  EXPECT_EQ(stores.listCollections(Dataclass::bookmarks, store).collections.back().path, path);
  runSQL(image.path(DeviceImage::databaseFile(platform::BookmarksSyncType)),
         "INSERT INTO collections (store, kind, parent, name, writable, is_default) "
         "SELECT store, kind, max(id), 'B', 1, 0 FROM collections");
  const RecordStores::Collections listed = stores.listCollections(Dataclass::bookmarks, store);
  EXPECT_THAT(listed.status.error.value().description, HasSubstr("nested too deep"));
  EXPECT_THAT(listed.collections, testing::IsEmpty());
}

// Ten thousand folders, each below one of a name of 100,000 bytes.
TEST(FoldersInFolders, FailAListingWhoseNamesTakeTooMuch) {
  const TemporaryImage image;
  ASSERT_TRUE(image.stores()
                  .addRecords(Dataclass::bookmarks, "x",
                              std::vector{record("a", "1", 1, {std::string(100'000, 'A')})})
                  .status.isSuccess());
  RecordStores stores = image.stores();
  const Row store = stores.findStore(Dataclass::bookmarks, "x").store->row;
  runSQL(image.path(DeviceImage::databaseFile(platform::BookmarksSyncType)),
         "WITH RECURSIVE n (i) AS (SELECT 1 UNION SELECT i + 1 FROM n WHERE i < 10000) "
         "INSERT INTO collections (store, kind, parent, name, writable, is_default) "
         "SELECT c.store, c.kind, c.id, 'B' || i, 1, 0 FROM n, collections c "
         "WHERE c.name LIKE 'AA%'");
  EXPECT_THAT(stores.listCollections(Dataclass::bookmarks, store).status.error.value().description,
              HasSubstr("too many, nested too deep"));
}

// Of 1,001 folders in one another, and then of two halves that make 1,001.
TEST(FoldersInFolders, FailACopyWhereTheyAreTooDeepToBeListed) {
  const TemporaryImage image;
  const std::vector<std::string> path(1000, "A");
  ASSERT_TRUE(image.stores()
                  .addRecords(Dataclass::bookmarks, "x",
                              std::vector{record("a", "1", 1, {path.begin(), path.begin() + 500}),
                                          record("b", "1", 1, path)})
                  .status.isSuccess());
  const auto copied = [&](const char* to) {
    DeviceImageServices made(image.image);
    platform::SyncDataSource& sources = made.services().syncDataSource;
    const auto target = sources.createDataSource("Bookmarks", to, std::nullopt).source;
    const auto source = sources.createDataSource("Bookmarks", "x", std::nullopt).source;
    EXPECT_TRUE(sources.migrateRecords(source, target).isSuccess());
    return sources.commit(target);
  };
  EXPECT_TRUE(copied("deep").isSuccess());
  const std::string database = image.path(DeviceImage::databaseFile(platform::BookmarksSyncType));
  runSQL(database,
         "INSERT INTO collections (store, kind, parent, name, writable, is_default) "
         "SELECT c.store, c.kind, max(c.id), 'B', 1, 0 FROM collections c "
         "JOIN records r ON r.collection = c.id WHERE r.uid = 'b' AND r.store = 1; "
         "UPDATE records SET collection = last_insert_rowid() WHERE uid = 'b' AND store = 1");
  EXPECT_THAT(copied("deeper").error.value().description, HasSubstr("nested too deep"));
  runSQL(database, "DELETE FROM records WHERE uid = 'a' AND store = 1");
  EXPECT_THAT(copied("deepest").error.value().description, HasSubstr("nested too deep"));
}

TEST(FoldersThatHoldOneAnother, FailACopyInsteadOfGoingRoundForEver) {
  const TemporaryImage image;
  ASSERT_TRUE(
      image.stores()
          .addRecords(Dataclass::bookmarks, "x", std::vector{record("a", "1", 1, {"A", "B"})})
          .status.isSuccess());
  runSQL(image.path(DeviceImage::databaseFile(platform::BookmarksSyncType)),
         "UPDATE collections SET parent = 2 WHERE name = 'A'");
  DeviceImageServices made(image.image);
  platform::SyncDataSource& sources = made.services().syncDataSource;
  const auto local = sources.createDataSource("Bookmarks", std::nullopt, std::nullopt).source;
  const auto service = sources.createDataSource("Bookmarks", "x", std::nullopt).source;
  EXPECT_EQ(sources.migrateRecords(service, local).code, 0);
  EXPECT_THAT(sources.commit(local).error.value().description, HasSubstr("hold one another"));
  EXPECT_EQ(image.stores().findStore(Dataclass::bookmarks, std::nullopt).store, std::nullopt);
}

}  // namespace
}  // namespace deviceimage
