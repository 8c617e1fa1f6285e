// The stores of an image as tools see them.
#include <gmock/gmock.h>

#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using Lines = std::vector<std::string>;

// "contacts local active", "calendars Quillnet:ada retired".
std::vector<std::string> summaryOf(const std::vector<Store>& stores) {
  std::vector<std::string> lines;
  for (const Store& store : stores)
    lines.push_back(std::string(dataclassName(store.dataclass)) + " " +
                    store.account.value_or("local") + (store.retired ? " retired " : " active ") +
                    std::to_string(store.records));
  return lines;
}

TEST(RecordStores, ShowAnImageWithoutDatabasesAsEmptyAndMakeNoFile) {
  const TemporaryImage image;
  RecordStores stores(image.image, RecordStores::Access::readOnly);
  EXPECT_THAT(stores.listStores().stores, IsEmpty());
  EXPECT_EQ(stores.findStore(Dataclass::notes, std::nullopt).store, std::nullopt);
  EXPECT_THAT(stores.listCollections(Dataclass::notes, 1).collections, IsEmpty());
  EXPECT_EQ(stores.readContent(Dataclass::notes, 1).bytes, std::nullopt);
  for (const DatabaseReport& report : stores.checkDatabases()) {
    EXPECT_FALSE(report.exists) << report.path;
    EXPECT_THAT(report.problems, IsEmpty());
  }
  EXPECT_NE(stores.ensureStore(Dataclass::notes, std::nullopt).code, 0);
  EXPECT_THAT(image.image->namesIn("var/mobile/Library/Notes"), IsEmpty());
}

TEST(RecordStores, KeepEveryByteOfARecord) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  const std::string content = std::string("BEGIN:VCARD\r\n\0\xff\xfe X-UNKNOWN:1", 28) + "\n";
  ASSERT_TRUE(
      stores.addRecords(Dataclass::contacts, std::nullopt, std::vector{record("a", content, -7)})
          .status.isSuccess());
  const Row store = stores.findStore(Dataclass::contacts, std::nullopt).store->row;
  std::vector<Record> seen;
  ASSERT_TRUE(stores
                  .visitRecords(Dataclass::contacts, store, true,
                                [&](const Record& visited, std::string_view bytes) {
                                  EXPECT_EQ(bytes, content);
                                  seen.push_back(visited);
                                  return true;
                                })
                  .isSuccess());
  ASSERT_EQ(seen.size(), 1U);
  EXPECT_EQ(seen[0].contentSize, 29);
  EXPECT_EQ(seen[0].modifiedAt, -7);
  EXPECT_EQ(seen[0].sourceUID, std::nullopt);
  EXPECT_EQ(stores.readContent(Dataclass::contacts, seen[0].row).bytes, content);
  EXPECT_EQ(stores.readContent(Dataclass::contacts, 99).bytes, std::nullopt);
}

TEST(RecordStores, TellWhatBecameOfAddedRecords) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  const auto first = stores.addRecords(
      Dataclass::notes, "x", std::vector{record("a", "1"), record("b", "2"), record("b", "2")});
  EXPECT_EQ(first.placed.added, 2);
  EXPECT_EQ(first.placed.alreadyThere, 1);
  const auto second =
      stores.addRecords(Dataclass::notes, "x", std::vector{record("a", "other", 2000)});
  EXPECT_EQ(second.placed.conflicts, 1);
  EXPECT_EQ(linesOf(image, Dataclass::notes, "x").size(), 3U);
}

TEST(RecordStores, AddAllRecordsOrNone) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  const auto added = stores.addRecords(Dataclass::notes, std::nullopt,
                                       std::vector{record("a", "1"), record("", "2")});
  EXPECT_FALSE(added.status.isSuccess());
  EXPECT_EQ(added.placed.added, 0);
  EXPECT_EQ(stores.findStore(Dataclass::notes, std::nullopt).store, std::nullopt);
  EXPECT_TRUE(stores.addRecords(Dataclass::notes, std::nullopt, std::vector{record("a", "1")})
                  .status.isSuccess());
}

TEST(RecordStores, TakeAnyTextAsAnIdentifier) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  const std::string names[] = {"'; DROP TABLE records; --", "../../x", "a\nb",
                               std::string(300, 'x'), "%s%n"};
  for (const std::string& name : names) {
    SCOPED_TRACE(name);
    ASSERT_TRUE(
        stores.addRecords(Dataclass::contacts, name, std::vector{record(name, name, 1, {name})})
            .status.isSuccess());
    EXPECT_EQ(linesOf(image, Dataclass::contacts, name), Lines{name + ": " + name});
  }
  EXPECT_THAT(databaseProblems(image), IsEmpty());
}

TEST(RecordStores, ListACalendarStoreForEachKindThatItHas) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  ASSERT_TRUE(stores.addRecords(Dataclass::calendars, "c", std::vector{record("e", "event")})
                  .status.isSuccess());
  ASSERT_TRUE(stores.ensureStore(Dataclass::calendars, std::nullopt).isSuccess());
  EXPECT_THAT(
      summaryOf(stores.listStores().stores),
      ElementsAre("calendars local active 0", "calendars c active 1", "reminders local active 0"));
  EXPECT_EQ(stores.findStore(Dataclass::reminders, "c").store->records, 0);
}

TEST(RecordStores, ListNestedFoldersAfterTheirParents) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  ASSERT_TRUE(
      stores
          .addRecords(Dataclass::bookmarks, std::nullopt,
                      std::vector{record("1", "1", 1, {"A", "B", "C"}), record("2", "2", 1, {"D"}),
                                  record("3", "3", 1, {"A", "E"})})
          .status.isSuccess());
  const Row store = stores.findStore(Dataclass::bookmarks, std::nullopt).store->row;
  std::vector<std::vector<std::string>> paths;
  for (const Collection& folder : stores.listCollections(Dataclass::bookmarks, store).collections)
    paths.push_back(folder.path);
  EXPECT_THAT(paths, ElementsAre(Lines{"A"}, Lines{"D"}, Lines{"A", "B"}, Lines{"A", "E"},
                                 Lines{"A", "B", "C"}));
}

TEST(RecordStores, EndAVisitWhenTheVisitorHasEnough) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  ASSERT_TRUE(stores
                  .addRecords(Dataclass::contacts, "x",
                              std::vector{record("a", "1"), record("b", "2"), record("c", "3")})
                  .status.isSuccess());
  Lines seen;
  const auto visitor = [&](const Record& visited, std::string_view) {
    seen.push_back(visited.uid);
    return seen.size() < 2;
  };
  const Row store = stores.findStore(Dataclass::contacts, "x").store->row;
  EXPECT_TRUE(stores.visitRecords(Dataclass::contacts, store, false, visitor).isSuccess());
  EXPECT_EQ(seen, (Lines{"a", "b"}));
}

TEST(RecordStores, HaveNothingOfADatabaseThatIsNotThere) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  const auto visitor = [](const Record&, std::string_view) { return true; };
  EXPECT_TRUE(stores.visitRecords(Dataclass::notes, 1, true, visitor).isSuccess());
  EXPECT_EQ(stores.readContent(Dataclass::notes, 1).bytes, std::nullopt);
  EXPECT_EQ(stores.syncAnchor(Dataclass::notes, 1).anchor, std::nullopt);
  EXPECT_EQ(stores.purgeRetiredStore(Dataclass::notes, 1).status.error.value().description,
            "the image has no notes database");
}

TEST(RecordStores, KeepRecordsOfMailToo) {
  const TemporaryImage image;
  RecordStores stores = image.stores();
  ASSERT_TRUE(stores.addRecords(Dataclass::mail, std::nullopt, std::vector{record("a", "Ada")})
                  .status.isSuccess());
  const Row store = stores.findStore(Dataclass::mail, std::nullopt).store->row;
  EXPECT_EQ(stores.listCollections(Dataclass::mail, store).collections.front().path,
            Lines{"Mail Accounts"});
}

TEST(RecordStores, NestFoldersSoFarAndNoFurther) {
  const TemporaryImage image;
  const auto add = [&](std::size_t levels) {
    return image.stores()
        .addRecords(Dataclass::bookmarks, "x", std::vector{record("a", "1", 1, Lines(levels, "A"))})
        .status;
  };
  EXPECT_EQ(add(1001).error.value().description.substr(0, 29), "folders are nested deeper tha");
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks, "x"), Lines{});
  EXPECT_TRUE(add(1000).isSuccess());
}

class RetiredStore : public testing::Test {
 protected:
  RetiredStore() {
    const auto added =
        stores.addRecords(Dataclass::bookmarks, "x",
                          std::vector{record("a", "1", 1, {"Deep", "Deeper"}), record("b", "2")});
    EXPECT_TRUE(added.status.isSuccess());
    store = stores.findStore(Dataclass::bookmarks, "x").store->row;
    EXPECT_TRUE(stores.retireStore(Dataclass::bookmarks, store).isSuccess());
  }
  TemporaryImage image;
  RecordStores stores = image.stores();
  Row store = 0;
};

TEST_F(RetiredStore, ComesBackAsOftenAsOneLikesWithoutDoublingAnything) {
  for (int run = 0; run < 2; ++run) {
    EXPECT_TRUE(
        stores.bringBackRetiredStore(Dataclass::bookmarks, store, std::nullopt).status.isSuccess());
    EXPECT_EQ(linesOf(image, Dataclass::bookmarks), (Lines{"a: 1", "b: 2"}));
  }
  EXPECT_EQ(retiredLinesOf(image, Dataclass::bookmarks, "x"), (Lines{"a: 1", "b: 2"}));
}

TEST_F(RetiredStore, LeavesTheImageWhenItIsPurged) {
  const RecordStores::Purged purged = stores.purgeRetiredStore(Dataclass::bookmarks, store);
  EXPECT_TRUE(purged.status.isSuccess());
  EXPECT_EQ(purged.records, 2);
  EXPECT_THAT(stores.listStores().stores, IsEmpty());
  EXPECT_THAT(databaseProblems(image), IsEmpty());
}

TEST_F(RetiredStore, IsTheOnlyKindOfStoreThatIsPurgedOrBroughtBack) {
  ASSERT_TRUE(stores.addRecords(Dataclass::bookmarks, "x", std::vector{record("a", "1")})
                  .status.isSuccess());
  const Row active = stores.findStore(Dataclass::bookmarks, "x").store->row;
  for (const Row row : {active, Row{99}}) {
    EXPECT_FALSE(stores.purgeRetiredStore(Dataclass::bookmarks, row).status.isSuccess());
    EXPECT_FALSE(
        stores.bringBackRetiredStore(Dataclass::bookmarks, row, std::nullopt).status.isSuccess());
  }
  EXPECT_EQ(linesOf(image, Dataclass::bookmarks, "x"), Lines{"a: 1"});
}

}  // namespace
}  // namespace deviceimage
