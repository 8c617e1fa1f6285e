// Data sources over the stores of an image.
#include <gmock/gmock.h>

#include "deviceimage/ContentHash.h"
#include "deviceimage/DeviceImageServices.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using platform::DataSourceOptions;
using platform::DataSourcePtr;
using testing::ElementsAre;
using testing::IsEmpty;
using Lines = std::vector<std::string>;

constexpr const char* kAccount = "Quillnet:ada";
// The first 16 digits of the SHA-256 of "old".
constexpr const char* kOldHash = "cba06b5736faf67e";

class ImageSources : public testing::Test {
 protected:
  void add(Dataclass dataclass, const std::optional<std::string>& account,
           const std::vector<NewRecord>& records) {
    const RecordStores::Added added = image.stores().addRecords(dataclass, account, records);
    ASSERT_TRUE(added.status.isSuccess()) << added.status.error->description;
  }
  DataSourcePtr open(const char* name, const std::optional<std::string>& account = std::nullopt,
                     const DataSourceOptions& options = std::nullopt) {
    return sources().createDataSource(name, account, options).source;
  }
  platform::SyncDataSource& sources() { return services.services().syncDataSource; }
  // What the migration does with one dataclass of several stores.
  void migrate(const char* name, const DataSourceOptions& localOptions = std::nullopt,
               const DataSourceOptions& serviceOptions = std::nullopt) {
    const DataSourcePtr local = open(name, std::nullopt, localOptions);
    const DataSourcePtr service = open(name, kAccount, serviceOptions);
    EXPECT_EQ(sources().migrateRecords(service, local).code, 0);
    EXPECT_EQ(sources().commit(local).code, 0);
    EXPECT_EQ(sources().deleteDataSource(local).code, 0);
    EXPECT_EQ(sources().commit(service).code, 0);
    EXPECT_EQ(sources().deleteDataSource(service).code, 0);
  }

  TemporaryImage image;
  DeviceImageServices services{image.image};
};

const DataSourceOptions kEventsOnly =
    propertylist::Dictionary{{platform::EventsOnlySourceOption, true}};
const DataSourceOptions kRemindersOnly =
    propertylist::Dictionary{{platform::RemindersOnlySourceOption, true}};

TEST_F(ImageSources, CopyEachRecordOnceHoweverOftenAMigrationIsRepeated) {
  add(Dataclass::contacts, kAccount, {record("a", "Ada"), record("b", "Bo")});
  add(Dataclass::contacts, std::nullopt, {record("c", "Cy")});
  for (int run = 0; run < 3; ++run) {
    migrate("Contacts");
    EXPECT_EQ(linesOf(image, Dataclass::contacts), (Lines{"a: Ada", "b: Bo", "c: Cy"}));
  }
  EXPECT_EQ(linesOf(image, Dataclass::contacts, kAccount), (Lines{"a: Ada", "b: Bo"}));
  EXPECT_THAT(databaseProblems(image), IsEmpty());
}

TEST_F(ImageSources, NoteWhereACopiedRecordCameFrom) {
  add(Dataclass::notes, kAccount, {record("n", "text")});
  migrate("Notes");
  RecordStores stores = image.stores();
  const Store local = *stores.findStore(Dataclass::notes, std::nullopt).store;
  std::vector<std::string> seen;
  ASSERT_TRUE(stores
                  .visitRecords(Dataclass::notes, local.row, false,
                                [&](const Record& copied, std::string_view) {
                                  seen.push_back(*copied.sourceAccount + " " + *copied.sourceUID);
                                  return true;
                                })
                  .isSuccess());
  EXPECT_EQ(seen, Lines{"Quillnet:ada n"});
}

TEST_F(ImageSources, KeepTheNewerOfTwoContentsUnderTheUIDAndTheOtherAsAConflictCopy) {
  add(Dataclass::contacts, std::nullopt, {record("u", "old", 1000)});
  add(Dataclass::contacts, kAccount, {record("u", "new", 2000)});
  for (int run = 0; run < 2; ++run) {
    migrate("Contacts");
    EXPECT_EQ(linesOf(image, Dataclass::contacts),
              (Lines{"u: new", std::string("u-conflict-") + kOldHash + ": old (of u)"}));
  }
}

TEST_F(ImageSources, KeepTheLocalContentUnderTheUIDWhenItIsTheNewer) {
  add(Dataclass::contacts, std::nullopt, {record("u", "new", 2000)});
  add(Dataclass::contacts, kAccount, {record("u", "old", 1000)});
  for (int run = 0; run < 2; ++run) {
    migrate("Contacts");
    EXPECT_EQ(linesOf(image, Dataclass::contacts),
              (Lines{"u: new", std::string("u-conflict-") + kOldHash + ": old (of u)"}));
  }
}

TEST_F(ImageSources, DecideBetweenContentsOfOneTimeTheSameWayInBothDirections) {
  add(Dataclass::contacts, std::nullopt, {record("u", "old"), record("v", "new")});
  add(Dataclass::contacts, kAccount, {record("u", "new"), record("v", "old")});
  migrate("Contacts");
  const Lines lines = linesOf(image, Dataclass::contacts);
  ASSERT_EQ(lines.size(), 4U);
  EXPECT_EQ(lines[0].substr(1), lines[2].substr(1));  // "u: X" and "v: X"
}

TEST_F(ImageSources, KeepEveryVersionThatAServiceSendsOneAfterTheOther) {
  add(Dataclass::contacts, kAccount, {record("u", "old", 1000)});
  migrate("Contacts");
  const DataSourcePtr service = open("Contacts", kAccount);
  EXPECT_EQ(sources().removeStore(service, false).code, 0);
  add(Dataclass::contacts, kAccount, {record("u", "new", 2000)});
  migrate("Contacts");
  migrate("Contacts");
  EXPECT_EQ(linesOf(image, Dataclass::contacts),
            (Lines{"u: new", std::string("u-conflict-") + kOldHash + ": old (of u)"}));
  EXPECT_THAT(databaseProblems(image), IsEmpty());
}

TEST_F(ImageSources, GiveAConflictCopyAnotherUIDWhenSomebodyHasTaken) {
  const std::string taken = std::string("u-conflict-") + kOldHash;
  add(Dataclass::contacts, std::nullopt, {record("u", "new", 2000), record(taken, "own")});
  add(Dataclass::contacts, kAccount, {record("u", "old", 1000)});
  migrate("Contacts");
  migrate("Contacts");
  const Lines lines = linesOf(image, Dataclass::contacts);
  ASSERT_EQ(lines.size(), 3U);
  EXPECT_EQ(lines[1], taken + ": own");
  EXPECT_TRUE(lines[2].starts_with(taken) && lines[2].ends_with(": old (of u)")) << lines[2];
}

TEST_F(ImageSources, CountWhenTheUIDsOfAConflictCopyAreTaken) {
  const std::string longer = "u-conflict-" + contentHash("old");
  add(Dataclass::contacts, std::nullopt,
      {record("u", "new", 2000), record(std::string("u-conflict-") + kOldHash, "own"),
       record(longer, "own too"), record(longer + "-2", "and this")});
  add(Dataclass::contacts, kAccount, {record("u", "old", 1000)});
  migrate("Contacts");
  EXPECT_THAT(linesOf(image, Dataclass::contacts), testing::Contains(longer + "-3: old (of u)"));
}

TEST_F(ImageSources, PutACopyIntoTheFoldersOfTheSameNames) {
  add(Dataclass::bookmarks, kAccount,
      {record("1", "one", 1000, {"Work", "Projects"}), record("2", "two", 1000, {"Work"})});
  add(Dataclass::bookmarks, std::nullopt, {record("3", "three", 1000, {"Work"})});
  migrate("Bookmarks");
  RecordStores stores = image.stores();
  const Store local = *stores.findStore(Dataclass::bookmarks, std::nullopt).store;
  std::vector<std::pair<std::vector<std::string>, std::int64_t>> folders;
  for (const Collection& folder :
       stores.listCollections(Dataclass::bookmarks, local.row).collections)
    folders.emplace_back(folder.path, folder.records);
  EXPECT_THAT(folders,
              ElementsAre(std::pair(Lines{"Work"}, 2), std::pair(Lines{"Work", "Projects"}, 1)));
}

TEST_F(ImageSources, FailToCommitWhenARecordThatWasToBeCopiedIsGone) {
  add(Dataclass::contacts, kAccount, {record("a", "Ada"), record("b", "Bo")});
  const DataSourcePtr local = open("Contacts");
  EXPECT_EQ(sources().migrateRecords(open("Contacts", kAccount), local).code, 0);
  RecordStores stores = image.stores();
  const Row service = stores.findStore(Dataclass::contacts, kAccount).store->row;
  ASSERT_TRUE(stores.retireStore(Dataclass::contacts, service).isSuccess());
  ASSERT_TRUE(stores.purgeRetiredStore(Dataclass::contacts, service).status.isSuccess());
  const platform::Status committed = sources().commit(local);
  EXPECT_NE(committed.code, 0);
  ASSERT_TRUE(committed.error);
  EXPECT_EQ(committed.error->description, "a record that was to be copied is gone");
  EXPECT_THAT(linesOf(image, Dataclass::contacts), IsEmpty());
}

TEST_F(ImageSources, ChangeNothingBeforeTheCommitNorWithoutOne) {
  add(Dataclass::contacts, kAccount, {record("a", "Ada")});
  const DataSourcePtr local = open("Contacts");
  const DataSourcePtr service = open("Contacts", kAccount);
  EXPECT_EQ(sources().migrateRecords(service, local).code, 0);
  EXPECT_EQ(sources().clearAllRecords(service).code, 0);
  EXPECT_EQ(sources().countRecords(service).count, 1);
  EXPECT_EQ(sources().countRecords(local).count, 0);
  EXPECT_EQ(sources().deleteDataSource(local).code, 0);
  EXPECT_EQ(sources().deleteDataSource(service).code, 0);
  EXPECT_EQ(image.stores().findStore(Dataclass::contacts, std::nullopt).store, std::nullopt);
  EXPECT_EQ(linesOf(image, Dataclass::contacts, kAccount), Lines{"a: Ada"});
}

TEST_F(ImageSources, RetireWhatIsClearedAndKeepItsFolders) {
  add(Dataclass::notes, kAccount, {record("n", "text", 1000, {"Trips", "Sea"})});
  const DataSourcePtr service = open("Notes", kAccount);
  EXPECT_EQ(sources().clearAllRecords(service).code, 0);
  EXPECT_EQ(sources().commit(service).code, 0);
  EXPECT_EQ(sources().commit(service).code, 0);
  EXPECT_THAT(linesOf(image, Dataclass::notes, kAccount), IsEmpty());
  RecordStores stores = image.stores();
  const std::vector<Store> all = stores.listStores(Dataclass::notes).stores;
  ASSERT_EQ(all.size(), 2U);
  EXPECT_FALSE(all[0].retired);
  EXPECT_EQ(all[0].account, kAccount);
  EXPECT_TRUE(all[1].retired);
  EXPECT_EQ(all[1].account, kAccount);
  EXPECT_EQ(linesOf(stores, Dataclass::notes, all[1]), Lines{"n: text"});
  EXPECT_EQ(stores.listCollections(Dataclass::notes, all[1].row).collections.back().path,
            (Lines{"Trips", "Sea"}));
  EXPECT_THAT(databaseProblems(image), IsEmpty());
}

TEST_F(ImageSources, RetireAStoreThatIsRemovedAtOnceAndSeeItNoMore) {
  add(Dataclass::contacts, kAccount, {record("a", "Ada")});
  const DataSourcePtr service = open("Contacts", kAccount);
  EXPECT_EQ(sources().removeStore(service, false).code, 0);
  EXPECT_EQ(sources().countRecords(service).count, 0);
  EXPECT_EQ(sources().deleteDataSource(service).code, 0);
  EXPECT_EQ(sources().countRecords(open("Contacts", kAccount)).count, 0);
  EXPECT_EQ(retiredLinesOf(image, Dataclass::contacts, kAccount), Lines{"a: Ada"});
}

TEST_F(ImageSources, RetireLocalRecordsToo) {
  add(Dataclass::contacts, std::nullopt, {record("a", "Ada")});
  const DataSourcePtr local = open("Contacts");
  EXPECT_EQ(sources().removeStore(local, false).code, 0);
  EXPECT_EQ(retiredLinesOf(image, Dataclass::contacts, std::nullopt), Lines{"a: Ada"});
}

TEST_F(ImageSources, RetireEveryRecordWhenAStoreIsRemovedBetweenClearingAndCommit) {
  add(Dataclass::calendars, kAccount, {record("e", "event")});
  add(Dataclass::reminders, kAccount, {record("t", "todo")});
  const DataSourcePtr service = open("Calendars", kAccount, kEventsOnly);
  EXPECT_EQ(sources().clearAllRecords(service).code, 0);
  EXPECT_EQ(sources().removeStore(service, false).code, 0);
  EXPECT_EQ(sources().commit(service).code, 0);
  EXPECT_EQ(retiredLinesOf(image, Dataclass::calendars, kAccount), Lines{"e: event"});
  EXPECT_EQ(retiredLinesOf(image, Dataclass::reminders, kAccount), Lines{"t: todo"});
}

TEST_F(ImageSources, CopyWhatWasThereWhenTheMigrationWasAskedForAlsoWhenItIsRetiredSince) {
  add(Dataclass::contacts, kAccount, {record("a", "Ada")});
  const DataSourcePtr local = open("Contacts");
  const DataSourcePtr service = open("Contacts", kAccount);
  EXPECT_EQ(sources().migrateRecords(service, local).code, 0);
  EXPECT_EQ(sources().clearAllRecords(service).code, 0);
  EXPECT_EQ(sources().commit(service).code, 0);
  EXPECT_EQ(sources().removeStore(service, false).code, 0);
  EXPECT_EQ(sources().commit(local).code, 0);
  EXPECT_EQ(linesOf(image, Dataclass::contacts), Lines{"a: Ada"});
}

TEST_F(ImageSources, TellEventsAndRemindersApartByTheirOptions) {
  add(Dataclass::calendars, kAccount, {record("1", "event"), record("2", "event 2")});
  add(Dataclass::reminders, kAccount, {record("1", "todo")});
  EXPECT_EQ(sources().countRecords(open("Calendars", kAccount)).count, 3);
  EXPECT_EQ(sources().countRecords(open("Calendars", kAccount, kEventsOnly)).count, 2);
  EXPECT_EQ(sources().countRecords(open("Calendars", kAccount, kRemindersOnly)).count, 1);
  // The service's source of reminders is opened without options.
  migrate("Calendars", kRemindersOnly);
  EXPECT_EQ(linesOf(image, Dataclass::reminders), Lines{"1: todo"});
  EXPECT_THAT(linesOf(image, Dataclass::calendars), IsEmpty());
  const DataSourcePtr events = open("Calendars", kAccount, kEventsOnly);
  EXPECT_EQ(sources().clearAllRecords(events).code, 0);
  EXPECT_EQ(sources().commit(events).code, 0);
  EXPECT_EQ(linesOf(image, Dataclass::reminders, kAccount), Lines{"1: todo"});
}

TEST_F(ImageSources, MakeNoFileBeforeThereIsSomethingToKeep) {
  const DataSourcePtr service = open("Contacts", kAccount);
  EXPECT_EQ(sources().countRecords(service).count, 0);
  EXPECT_EQ(sources().clearAllRecords(service).code, 0);
  EXPECT_EQ(sources().clearSyncAnchors(service).code, 0);
  EXPECT_EQ(sources().removeStore(service, false).code, 0);
  EXPECT_EQ(sources().commit(service).code, 0);
  EXPECT_FALSE(
      std::filesystem::exists(image.path(DeviceImage::databaseFile(platform::ContactsSyncType))));
  EXPECT_EQ(sources().commit(open("Contacts")).code, 0);
  EXPECT_NE(image.stores().findStore(Dataclass::contacts, std::nullopt).store, std::nullopt);
}

TEST_F(ImageSources, HaveNothingToDoWhereThereIsNoDatabaseOrStore) {
  const auto workOn = [&](const std::optional<std::string>& account) {
    const DataSourcePtr source = open("Contacts", account);
    EXPECT_EQ(sources().clearSyncAnchors(source).code, 0);
    EXPECT_EQ(sources().migrateRecords(source, open("Contacts")).code, 0);
    EXPECT_EQ(sources().removeStore(source, false).code, 0);
    EXPECT_EQ(sources().commit(source).code, 0);
  };
  workOn("nobody");
  EXPECT_FALSE(
      std::filesystem::exists(image.path(DeviceImage::databaseFile(platform::ContactsSyncType))));
  add(Dataclass::contacts, kAccount, {record("a", "Ada")});
  workOn("nobody");
  EXPECT_EQ(linesOf(image, Dataclass::contacts, kAccount), Lines{"a: Ada"});
  EXPECT_THAT(retiredLinesOf(image, Dataclass::contacts, "nobody"), IsEmpty());
}

TEST_F(ImageSources, RetireNothingWhenAStoreWithoutRecordsIsCleared) {
  ASSERT_TRUE(image.stores().ensureStore(Dataclass::contacts, kAccount).isSuccess());
  const DataSourcePtr source = open("Contacts", kAccount);
  EXPECT_EQ(sources().clearAllRecords(source).code, 0);
  EXPECT_EQ(sources().commit(source).code, 0);
  EXPECT_EQ(image.stores().listStores(Dataclass::contacts).stores.size(), 1U);
}

TEST_F(ImageSources, ForgetTheAnchorsOfWhatTheSourceHolds) {
  add(Dataclass::calendars, std::nullopt, {record("e", "event")});
  RecordStores stores = image.stores();
  const Row store = stores.findStore(Dataclass::calendars, std::nullopt).store->row;
  ASSERT_TRUE(stores.setSyncAnchor(Dataclass::calendars, store, "17").isSuccess());
  ASSERT_TRUE(stores.setSyncAnchor(Dataclass::reminders, store, "18").isSuccess());
  EXPECT_EQ(sources().clearSyncAnchors(open("Calendars", std::nullopt, kEventsOnly)).code, 0);
  EXPECT_EQ(stores.syncAnchor(Dataclass::calendars, store).anchor, std::nullopt);
  EXPECT_EQ(stores.syncAnchor(Dataclass::reminders, store).anchor, "18");
}

TEST_F(ImageSources, NameTheAccountsThatServeATypeAndWhetherTetheredSyncingIsOff) {
  add(Dataclass::contacts, std::nullopt, {record("a", "Ada")});
  add(Dataclass::contacts, "carddav-1", {record("b", "Bo")});
  const auto names = [&] {
    return *sources().externalSourcesEnabledForSyncType(platform::ContactsSyncType).names;
  };
  EXPECT_THAT(names(), ElementsAre("carddav-1"));
  EXPECT_EQ(sources().setTetheredSyncingDisabled(platform::ContactsSyncType, true).code, 0);
  EXPECT_THAT(names(), ElementsAre("DenyTethered", "carddav-1"));
  EXPECT_EQ(sources().setTetheredSyncingDisabled(platform::ContactsSyncType, false).code, 0);
  EXPECT_THAT(names(), ElementsAre("carddav-1"));
  EXPECT_EQ(sources().removeStore(open("Contacts", "carddav-1"), false).code, 0);
  EXPECT_THAT(names(), IsEmpty());
}

TEST_F(ImageSources, RefuseUnknownDataclassesAndEmptyHandlesAndClosedSources) {
  EXPECT_NE(sources().createDataSource(std::nullopt, std::nullopt, std::nullopt).status.code, 0);
  EXPECT_NE(sources().createDataSource("Photos", std::nullopt, std::nullopt).status.code, 0);
  EXPECT_NE(sources().createDataSource("Notes", "", std::nullopt).status.code, 0);
  const DataSourcePtr closed = open("Contacts");
  const DataSourcePtr notes = open("Notes");
  EXPECT_EQ(sources().deleteDataSource(closed).code, 0);
  for (const DataSourcePtr& source : {DataSourcePtr(), closed}) {
    EXPECT_NE(sources().countRecords(source).status.code, 0);
    EXPECT_NE(sources().clearAllRecords(source).code, 0);
    EXPECT_NE(sources().clearSyncAnchors(source).code, 0);
    EXPECT_NE(sources().migrateRecords(source, notes).code, 0);
    EXPECT_NE(sources().migrateRecords(notes, source).code, 0);
    EXPECT_NE(sources().commit(source).code, 0);
    EXPECT_NE(sources().removeStore(source, false).code, 0);
    EXPECT_NE(sources().deleteDataSource(source).code, 0);
  }
  EXPECT_NE(sources().migrateRecords(notes, open("Bookmarks")).code, 0);
}

TEST_F(ImageSources, MoveTwoThousandRecordsInOneCommit) {
  std::vector<NewRecord> records;
  for (int i = 0; i < 2000; ++i)
    records.push_back(record("uid-" + std::to_string(i), "BEGIN:VCARD " + std::to_string(i)));
  add(Dataclass::contacts, kAccount, records);
  migrate("Contacts");
  migrate("Contacts");
  EXPECT_EQ(sources().countRecords(open("Contacts")).count, 2000);
}

}  // namespace
}  // namespace deviceimage
