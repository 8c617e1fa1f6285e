#include "host/RecordAccounting.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using deviceimage::Dataclass;
using propertylist::Array;
using propertylist::Dictionary;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace host {
namespace {

const Selection kSelection = {"Status", {{{"Quillnet"}, 1}}};
const deviceimage::SyncAgent kAgent{std::string("ada")};
const std::optional<std::string> kLocal;
const std::optional<std::string> kService = "Quillnet:ada";

Dictionary quillnetAccount(std::string_view identifier, const Array& dataclasses) {
  return {{"Identifier", identifier},
          {"Type", "Quillnet"},
          {"Status", 1},
          {"Enabled Dataclasses", dataclasses}};
}

const Dictionary kAccount =
    quillnetAccount("Q", {"com.vantor.Dataclass.Contacts", "com.vantor.Dataclass.Backup"});

ObservedStore active(const std::optional<std::string>& account, std::vector<ObservedRecord> records,
                     Dataclass dataclass = Dataclass::contacts) {
  return {dataclass, account, false, std::move(records)};
}

ObservedStore retired(std::vector<ObservedRecord> records) {
  return {Dataclass::contacts, kService, true, std::move(records)};
}

Observation looked(std::vector<Dictionary> accounts, std::vector<ObservedStore> stores) {
  Observation observation;
  observation.settings.accounts = std::move(accounts);
  observation.stores = std::move(stores);
  return observation;
}

RecordAccounting account(const Observation& before, const Observation& after) {
  return accountForRecords(before, after, kSelection, kAgent);
}

// The eight figures in the order of the report.
std::vector<std::int64_t> figures(const DataclassReport& line) {
  return {line.serviceBefore, line.localBefore,    line.localAfter, line.moved,
          line.alreadyThere,  line.conflictCopies, line.retired,    line.leftBehind};
}

TEST(RecordAccounting, FollowsEachRecordToItsPlace) {
  struct Case {
    const char* name;
    std::vector<ObservedRecord> service, local;  // before
    std::vector<ObservedRecord> serviceAfter, localAfter, retiredAfter;
    std::vector<std::int64_t> expected;
  };
  const Case kCases[] = {
      {"moved", {{"a", "A"}}, {}, {}, {{"a", "A"}}, {{"a", "A"}}, {1, 0, 1, 1, 0, 0, 0, 0}},
      {"moved and still in its store too",
       {{"a", "A"}},
       {},
       {{"a", "A"}},
       {{"a", "A"}},
       {},
       {1, 0, 1, 1, 0, 0, 0, 0}},
      {"already there", {{"a", "A"}}, {{"a", "A"}}, {}, {{"a", "A"}}, {}, {1, 1, 1, 0, 1, 0, 0, 0}},
      {"an equal one is there under another name",
       {{"a", "A"}},
       {{"b", "A"}},
       {},
       {{"a", "A"}, {"b", "A"}},
       {{"a", "A"}},
       {1, 1, 2, 1, 0, 0, 0, 0}},
      {"already there as a conflict copy",
       {{"a", "S"}},
       {{"a", "L"}, {"a-2", "S", "a"}},
       {},
       {{"a", "L"}, {"a-2", "S", "a"}},
       {},
       {1, 2, 2, 0, 1, 0, 0, 0}},
      {"conflict, the service's copy kept beside",
       {{"a", "S"}},
       {{"a", "L"}},
       {},
       {{"a", "L"}, {"a-2", "S", "a"}},
       {},
       {1, 1, 2, 0, 0, 1, 0, 0}},
      {"conflict, the local copy kept beside",
       {{"a", "S"}},
       {{"a", "L"}},
       {},
       {{"a", "S"}, {"a-2", "L", "a"}},
       {},
       {1, 1, 2, 0, 0, 1, 0, 0}},
      {"retired", {{"a", "A"}}, {}, {}, {}, {{"a", "A"}}, {1, 0, 0, 0, 0, 0, 1, 0}},
      {"left behind", {{"a", "A"}}, {}, {{"a", "A"}}, {}, {}, {1, 0, 0, 0, 0, 0, 0, 1}},
      {"two equal ones, both moved",
       {{"a", "A"}, {"b", "A"}},
       {},
       {},
       {{"a", "A"}, {"b", "A"}},
       {},
       {2, 0, 2, 2, 0, 0, 0, 0}},
      {"one of two equal ones was there",
       {{"a", "A"}, {"b", "A"}},
       {{"a", "A"}},
       {},
       {{"a", "A"}, {"b", "A"}},
       {},
       {2, 1, 2, 1, 1, 0, 0, 0}},
      {"nothing at all", {}, {}, {}, {}, {}, {0, 0, 0, 0, 0, 0, 0, 0}},
  };
  for (const Case& c : kCases) {
    SCOPED_TRACE(c.name);
    const RecordAccounting result =
        account(looked({kAccount}, {active(kLocal, c.local), active(kService, c.service)}),
                looked({}, {active(kLocal, c.localAfter), active(kService, c.serviceAfter),
                            retired(c.retiredAfter)}));
    ASSERT_EQ(result.dataclasses.size(), 1U);
    EXPECT_EQ(figures(result.dataclasses[0]), c.expected);
    EXPECT_THAT(result.contradictions, IsEmpty());
  }
}

TEST(RecordAccounting, NoticesWhatDoesNotAddUp) {
  struct Case {
    const char* name;
    std::vector<ObservedStore> before, after;
    const char* sentence;
  };
  const Case kCases[] = {
      {"a service's record is nowhere",
       {active(kService, {{"a", "A"}})},
       {},
       "1 record of contacts from the store of account Q"},
      {"a record is moved with another content",
       {active(kService, {{"a", "A"}})},
       {active(kLocal, {{"a", "B"}})},
       "cannot be found"},
      {"one of two equal records is nowhere",
       {active(kService, {{"a", "A"}, {"b", "A"}})},
       {active(kLocal, {{"a", "A"}})},
       "1 record of contacts from the store of account Q"},
      {"one of two equal records is in a retired store twice",
       {active(kService, {{"a", "A"}, {"b", "A"}})},
       {retired({{"a", "A"}}), retired({{"a", "A"}})},
       "1 record of contacts from the store of account Q"},
      {"one of two equal local records is gone",
       {active(kLocal, {{"a", "A"}, {"b", "A"}})},
       {active(kLocal, {{"b", "A"}})},
       "1 record of contacts in the local store are gone"},
      {"a local record has got another UID",
       {active(kLocal, {{"a", "A"}})},
       {active(kLocal, {{"b", "A"}})},
       "local store are gone"},
      {"one of two equal retired records is gone",
       {retired({{"r", "R"}}), retired({{"r", "R"}})},
       {retired({{"r", "R"}})},
       "1 record of contacts in retired stores are gone"},
      {"a retired record is in the local store instead",
       {retired({{"r", "R"}})},
       {active(kLocal, {{"r", "R"}})},
       "retired stores are gone"},
      {"a record that is there comes once more",
       {active(kLocal, {{"a", "A"}}), active(kService, {{"a", "A"}})},
       {active(kLocal, {{"a", "A"}, {"a-2", "A", "a"}})},
       "more than once"},
      {"a record comes into a retired store from nowhere",
       {},
       {retired({{"n", "N"}})},
       "1 record of contacts came into retired stores"},
      {"a record comes into the account's own store",
       {active(kService, {{"a", "A"}})},
       {active(kService, {{"a", "A"}, {"n", "N"}})},
       "1 record of contacts in the store of account Q were not there before"},
      {"a store of somebody comes with records",
       {},
       {active("E", {{"e", "E"}})},
       "The store E with contacts was not there before"},
      {"a local record is gone",
       {active(kLocal, {{"l", "L"}})},
       {active(kLocal, {})},
       "local store are gone"},
      {"a local record has changed",
       {active(kLocal, {{"l", "L"}})},
       {active(kLocal, {{"l", "M"}})},
       "local store are gone"},
      {"a record is moved twice",
       {active(kService, {{"a", "A"}})},
       {active(kLocal, {{"a", "A"}, {"b", "A"}})},
       "more than once"},
      {"a record comes from nowhere",
       {},
       {active(kLocal, {{"n", "N"}})},
       "1 record of contacts in the local store were in no"},
      {"a retired record is gone", {retired({{"r", "R"}})}, {}, "retired stores are gone"},
      {"the store of another account has changed",
       {active("E", {{"e", "E"}})},
       {active("E", {})},
       "The store E with contacts"},
      {"the store of another account is gone",
       {active("E", {{"e", "E"}})},
       {},
       "The store E with contacts"},
  };
  for (const Case& c : kCases) {
    SCOPED_TRACE(c.name);
    const RecordAccounting result = account(looked({kAccount}, c.before), looked({}, c.after));
    ASSERT_FALSE(result.contradictions.empty());
    EXPECT_THAT(result.contradictions, testing::Contains(HasSubstr(c.sentence)));
  }
}

TEST(RecordAccounting, LooksAtDataclassesThatNoAccountHas) {
  const RecordAccounting result =
      account(looked({}, {active(kLocal, {{"n", "N"}}, Dataclass::notes)}), looked({}, {}));
  EXPECT_THAT(result.dataclasses, IsEmpty());
  EXPECT_THAT(result.contradictions, ElementsAre(HasSubstr("1 record of notes")));
}

TEST(RecordAccounting, CountsASharedStoreInTheFirstAccountThatHasTheDataclassEnabled) {
  const std::vector<ObservedStore> before = {active(kService, {{"a", "A"}})};
  const std::vector<ObservedStore> after = {active(kLocal, {{"a", "A"}})};
  const RecordAccounting result =
      account(looked({quillnetAccount("first", {}),
                      quillnetAccount("second", {"com.vantor.Dataclass.Contacts"}),
                      quillnetAccount("third", {"com.vantor.Dataclass.Contacts"})},
                     before),
              looked({}, after));
  ASSERT_EQ(result.dataclasses.size(), 2U);
  EXPECT_EQ(result.dataclasses[0].account, "second");
  EXPECT_THAT(figures(result.dataclasses[0]), ElementsAre(1, 0, 1, 1, 0, 0, 0, 0));
  EXPECT_EQ(result.dataclasses[1].account, "third");
  EXPECT_THAT(figures(result.dataclasses[1]), ElementsAre(0, 0, 1, 0, 0, 0, 0, 0));
}

TEST(RecordAccounting, ListsAStoreWhoseDataclassIsNotEnabledAsLeftBehind) {
  const std::vector<ObservedStore> stores = {active(kService, {{"n", "N"}}, Dataclass::notes)};
  const RecordAccounting result = account(looked({kAccount}, stores), looked({}, stores));
  ASSERT_EQ(result.dataclasses.size(), 2U);
  EXPECT_EQ(result.dataclasses[1].dataclass, Dataclass::notes);
  EXPECT_THAT(figures(result.dataclasses[1]), ElementsAre(1, 0, 0, 0, 0, 0, 0, 1));
  EXPECT_THAT(
      result.leftBehind,
      ElementsAre("1 record of notes of account Q is still in the account's own store alone."));
}

TEST(RecordAccounting, CountsEventsInBothOfAnAccountsCalendarStores) {
  Dictionary account = quillnetAccount("Q", {"com.vantor.Dataclass.Calendars"});
  account.set("ChildAccounts",
              Array{Dictionary{{"Identifier", "child"}, {"Class", "MobileCalDAVAccount"}}});
  const RecordAccounting result =
      accountForRecords(looked({account}, {active("child", {{"a", "A"}}, Dataclass::calendars),
                                           active(kService, {{"b", "B"}}, Dataclass::calendars)}),
                        looked({}, {active(kLocal, {{"a", "A"}}, Dataclass::calendars),
                                    active(kService, {{"b", "B"}}, Dataclass::calendars)}),
                        kSelection, kAgent);
  ASSERT_EQ(result.dataclasses.size(), 1U);
  EXPECT_THAT(figures(result.dataclasses[0]), ElementsAre(2, 0, 1, 1, 0, 0, 0, 1));
  EXPECT_THAT(result.contradictions, IsEmpty());
}

TEST(RecordAccounting, TellsOfRecordsThatAreInARetiredStoreAlone) {
  const RecordAccounting result =
      account(looked({kAccount}, {active(kService, {{"a", "A"}, {"b", "B"}})}),
              looked({}, {retired({{"a", "A"}, {"b", "B"}})}));
  EXPECT_THAT(result.leftBehind,
              ElementsAre("2 records of contacts of account Q are in a retired store alone, which "
                          "can be exported or brought back."));
}

}  // namespace
}  // namespace host
