// Of bookmarks and mail accounts the device keeps one store, which the device-local account takes
// over.
#include <gmock/gmock.h>

#include "deviceimage/DeviceImageServices.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using testing::IsEmpty;
using Lines = std::vector<std::string>;

class TakeOver : public testing::Test {
 protected:
  TakeOver() {
    const auto written =
        image.image->writePropertyList(*DeviceImage::preferencesFile("com.vantor.OTASyncAgent"),
                                       propertylist::Dictionary{{"AccountName", "ada"}});
    EXPECT_TRUE(written.isSuccess());
    add(Dataclass::bookmarks, "Quillnet:ada",
        {record("1", "one", 5, {"Work"}), record("2", "two")});
    add(Dataclass::bookmarks, "other", {record("3", "three")});
    add(Dataclass::bookmarks, std::nullopt, {record("1", "own one", 9)});
  }
  void add(Dataclass dataclass, const std::optional<std::string>& account,
           const std::vector<NewRecord>& records) {
    ASSERT_TRUE(image.stores().addRecords(dataclass, account, records).status.isSuccess());
  }
  // What the migration does with a dataclass of one store.
  void createLocalDataSource(const char* name) {
    const platform::DataSourcePtr local =
        sources().createDataSource(name, std::nullopt, std::nullopt).source;
    EXPECT_EQ(sources().commit(local).code, 0);
    EXPECT_EQ(sources().deleteDataSource(local).code, 0);
  }
  platform::SyncDataSource& sources() { return services.services().syncDataSource; }

  TemporaryImage image;
  DeviceImageServices services{image.image};
};

TEST_F(TakeOver, MergesTheAgentsBookmarksIntoTheLocalStoreAndRetiresTheirs) {
  EXPECT_EQ(sources().setTetheredSyncingDisabled(platform::BookmarksSyncType, false).code, 0);
  for (int run = 0; run < 2; ++run) {
    createLocalDataSource("Bookmarks");
    // The first 16 digits of the SHA-256 of "one".
    EXPECT_EQ(linesOf(image, Dataclass::bookmarks),
              (Lines{"1: own one", "1-conflict-7692c3ad3540bb80: one (of 1)", "2: two"}));
    EXPECT_THAT(linesOf(image, Dataclass::bookmarks, "Quillnet:ada"), IsEmpty());
    EXPECT_EQ(retiredLinesOf(image, Dataclass::bookmarks, "Quillnet:ada"),
              (Lines{"1: one", "2: two"}));
    EXPECT_EQ(linesOf(image, Dataclass::bookmarks, "other"), Lines{"3: three"});
  }
  EXPECT_THAT(databaseProblems(image), IsEmpty());
}

TEST_F(TakeOver, WaitsForTheCommit) {
  const platform::DataSourcePtr local =
      sources().createDataSource("Bookmarks", std::nullopt, std::nullopt).source;
  EXPECT_EQ(sources().clearSyncAnchors(local).code, 0);
  EXPECT_EQ(sources().deleteDataSource(local).code, 0);
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks, "Quillnet:ada"), (Lines{"1: one", "2: two"}));
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks), Lines{"1: own one"});
}

TEST_F(TakeOver, DoesNotHappenWhileTetheredSyncingIsOff) {
  EXPECT_EQ(sources().setTetheredSyncingDisabled(platform::BookmarksSyncType, true).code, 0);
  createLocalDataSource("Bookmarks");
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks, "Quillnet:ada"), (Lines{"1: one", "2: two"}));
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks), Lines{"1: own one"});
}

TEST_F(TakeOver, DoesNotHappenWhenTheLocalStoreIsCleared) {
  const platform::DataSourcePtr local =
      sources().createDataSource("Bookmarks", std::nullopt, std::nullopt).source;
  EXPECT_EQ(sources().clearAllRecords(local).code, 0);
  EXPECT_EQ(sources().commit(local).code, 0);
  EXPECT_THAT(linesOf(image, Dataclass::bookmarks), IsEmpty());
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks, "Quillnet:ada"), (Lines{"1: one", "2: two"}));
}

TEST_F(TakeOver, DoesNotHappenWhenTheLocalStoreWasTheOriginOfAMigration) {
  const platform::DataSourcePtr local =
      sources().createDataSource("Bookmarks", std::nullopt, std::nullopt).source;
  const platform::DataSourcePtr other =
      sources().createDataSource("Bookmarks", "other", std::nullopt).source;
  EXPECT_EQ(sources().migrateRecords(local, other).code, 0);
  EXPECT_EQ(sources().commit(other).code, 0);
  EXPECT_EQ(sources().commit(local).code, 0);
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks), Lines{"1: own one"});
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks, "other"), (Lines{"1: own one", "3: three"}));
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks, "Quillnet:ada"), (Lines{"1: one", "2: two"}));
}

TEST_F(TakeOver, DoesNotHappenWithoutAnAccountNameOfTheAgent) {
  ASSERT_TRUE(image.image->removeFile(*DeviceImage::preferencesFile("com.vantor.OTASyncAgent"))
                  .isSuccess());
  createLocalDataSource("Bookmarks");
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks), Lines{"1: own one"});
}

TEST_F(TakeOver, LeavesDataclassesOfSeveralStoresAlone) {
  add(Dataclass::notes, "Quillnet:ada", {record("n", "note")});
  createLocalDataSource("Notes");
  EXPECT_THAT(linesOf(image, Dataclass::notes), IsEmpty());
  EXPECT_EQ(linesOf(image, Dataclass::notes, "Quillnet:ada"), Lines{"n: note"});
}

}  // namespace
}  // namespace deviceimage
