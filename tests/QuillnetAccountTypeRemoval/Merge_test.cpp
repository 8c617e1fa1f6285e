#include <gtest/gtest.h>

#include <optional>
#include <string>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

using Properties = std::optional<Dictionary>;

struct MergeCase {
  const char* name;
  Dictionary inMemory;
  Properties original, onDisk;
  Dictionary merged;
};

Dictionary mergeOf(const MergeCase& c) {
  const AccountsManagerPtr store = ASSAccountsManager::initWithAccounsInfoArray(std::nullopt);
  return store->mergeInMemoryPropertiesOriginalPropertiesOnDiskProperties(c.inMemory, c.original,
                                                                          c.onDisk);
}

void expectMerges(std::initializer_list<MergeCase> cases) {
  for (const MergeCase& c : cases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(mergeOf(c), c.merged);
  }
}

class Merge : public ::testing::Test {
 protected:
  AccountsDevice device;
};

// The same dictionary on two sides shares its storage, which the merge looks at first.
TEST_F(Merge, TakesTheOtherSideWhereOneIsTheOriginalItself) {
  const Dictionary original{{"a", 1}, {"b", 2}};
  const Dictionary other{{"a", 3}, {"c", 4}};
  EXPECT_EQ(mergeOf({"", original, original, other, {}}), other);
  EXPECT_EQ(mergeOf({"", other, original, original, {}}), other);
  EXPECT_EQ(mergeOf({"", original, original, original, {}}), original);
}

TEST_F(Merge, KeepsEachSidesOwnChangesAndPrefersMemoryWhereBothChanged) {
  expectMerges({
      {"changed on one side each, new on one side each",
       {{"a", 1}, {"b", 3}, {"e", 4}},
       Dictionary{{"a", 1}, {"b", 2}},
       Dictionary{{"a", 5}, {"b", 2}, {"d", 6}},
       {{"a", 5}, {"b", 3}, {"e", 4}, {"d", 6}}},
      {"changed on disk only", {{"a", 1}}, Dictionary{{"a", 1}}, Dictionary{{"a", 5}}, {{"a", 5}}},
      {"changed on both sides", {{"a", 2}}, Dictionary{{"a", 1}}, Dictionary{{"a", 3}}, {{"a", 2}}},
      {"changed in memory, gone on disk",
       {{"a", 2}},
       Dictionary{{"a", 1}},
       Dictionary{{"z", 0}},
       {{"a", 2}, {"z", 0}}},
      {"new in memory",
       {{"a", 1}, {"n", 1}},
       Dictionary{{"a", 1}},
       Dictionary{{"a", 1}},
       {{"a", 1}, {"n", 1}}},
      {"new on both sides",
       {{"a", 1}, {"n", 1}},
       Dictionary{{"a", 1}},
       Dictionary{{"a", 1}, {"n", 2}},
       {{"a", 1}, {"n", 1}}},
      {"new on disk",
       {{"a", 1}},
       Dictionary{{"a", 1}},
       Dictionary{{"a", 1}, {"d", 6}},
       {{"a", 1}, {"d", 6}}},
  });
}

TEST_F(Merge, DropsAKeyThatEitherSideDeletedUnlessMemoryChangedIt) {
  expectMerges({
      {"deleted in memory, changed on disk",
       {{"a", 1}},
       Dictionary{{"a", 1}, {"b", 2}},
       Dictionary{{"a", 1}, {"b", 9}},
       {{"a", 1}}},
      {"deleted in memory, unchanged on disk",
       {{"a", 1}},
       Dictionary{{"a", 1}, {"b", 2}},
       Dictionary{{"a", 1}, {"b", 2}},
       {{"a", 1}}},
      {"deleted on disk, unchanged in memory",
       {{"a", 1}, {"b", 2}},
       Dictionary{{"a", 1}, {"b", 2}},
       Dictionary{{"a", 1}},
       {{"a", 1}}},
      {"deleted on both sides",
       {{"a", 1}},
       Dictionary{{"a", 1}, {"b", 2}},
       Dictionary{{"a", 1}},
       {{"a", 1}}},
      {"everything deleted in memory",
       {},
       Dictionary{{"a", 1}},
       Dictionary{{"a", 1}, {"d", 6}},
       {{"d", 6}}},
  });
}

TEST_F(Merge, TakesMemoryAsItIsWithoutAnOriginalOrWithoutAFile) {
  expectMerges({
      {"empty original", {{"a", 1}}, Dictionary(), Dictionary{{"a", 5}, {"d", 6}}, {{"a", 1}}},
      {"no original", {{"a", 1}}, std::nullopt, Dictionary{{"a", 5}, {"d", 6}}, {{"a", 1}}},
      {"empty on disk", {{"a", 1}}, Dictionary{{"a", 1}}, Dictionary(), {{"a", 1}}},
      {"not on disk", {{"a", 1}}, Dictionary{{"a", 1}}, std::nullopt, {{"a", 1}}},
      {"neither", {{"a", 1}}, std::nullopt, std::nullopt, {{"a", 1}}},
      {"nothing at all", {}, std::nullopt, std::nullopt, {}},
  });
}

TEST_F(Merge, ComparesValuesByTheirContentAndKind) {
  const Array list = {"x", Dictionary{{"k", 1}}};
  const Array equalList = {"x", Dictionary{{"k", 1}}};
  expectMerges({
      {"an equal list that is another object is unchanged",
       {{"a", equalList}},
       Dictionary{{"a", list}},
       Dictionary{{"a", "disk"}},
       {{"a", "disk"}}},
      {"a list in another order is changed",
       {{"a", Array{Dictionary{{"k", 1}}, "x"}}},
       Dictionary{{"a", list}},
       Dictionary{{"a", "disk"}},
       {{"a", Array{Dictionary{{"k", 1}}, "x"}}}},
      {"integer and boolean differ",
       {{"a", true}},
       Dictionary{{"a", 1}},
       Dictionary{{"a", "disk"}},
       {{"a", true}}},
      {"integer and real differ",
       {{"a", 1.0}},
       Dictionary{{"a", 1}},
       Dictionary{{"a", "disk"}},
       {{"a", 1.0}}},
  });
}

TEST_F(Merge, TakesNestedValuesWholeFromOneSide) {
  const Value one = Array{Dictionary{{"Identifier", "one"}}};
  const Value two = Array{Dictionary{{"Identifier", "two"}}};
  expectMerges({
      {"changed on disk",
       {{"ChildAccounts", Array()}, {"Enabled Dataclasses", Array{"m"}}},
       Dictionary{{"ChildAccounts", Array()}, {"Enabled Dataclasses", Array{"m"}}},
       Dictionary{{"ChildAccounts", two}, {"Enabled Dataclasses", Array{"d"}}},
       {{"ChildAccounts", two}, {"Enabled Dataclasses", Array{"d"}}}},
      {"changed on both sides",
       {{"ChildAccounts", one}, {"Enabled Dataclasses", Array{"m", "n"}}},
       Dictionary{{"ChildAccounts", Array()}, {"Enabled Dataclasses", Array{"m"}}},
       Dictionary{{"ChildAccounts", two}, {"Enabled Dataclasses", Array{"m", "d"}}},
       {{"ChildAccounts", one}, {"Enabled Dataclasses", Array{"m", "n"}}}},
  });
}

TEST_F(Merge, ChangesNoneOfItsArguments) {
  const MergeCase c = {"",
                       {{"a", 1}, {"b", 3}},
                       Dictionary{{"a", 1}, {"b", 2}, {"c", 1}},
                       Dictionary{{"a", 5}, {"c", 2}, {"d", 6}},
                       {}};
  mergeOf(c);
  EXPECT_EQ(c.inMemory, (Dictionary{{"a", 1}, {"b", 3}}));
  EXPECT_EQ(c.original, (Dictionary{{"a", 1}, {"b", 2}, {"c", 1}}));
  EXPECT_EQ(c.onDisk, (Dictionary{{"a", 5}, {"c", 2}, {"d", 6}}));
}

TEST_F(Merge, TracesItsInputsFirstAndItsResultLast) {
  device.traceVerbosely();
  mergeOf({"", {{"a", 2}}, Dictionary{{"a", 1}}, Dictionary{{"a", 1}, {"d", 6}}, {}});
  EXPECT_EQ(device.logLines(), (Lines{"Merging inmem {a = 2} orig {a = 1} onDisk {a = 1; d = 6}",
                                      "merged to {a = 2; d = 6}"}));
}

TEST_F(Merge, TracesAlsoWhenThereIsNothingToMerge) {
  device.traceVerbosely();
  mergeOf({"", {{"a", 2}}, Dictionary(), std::nullopt, {}});
  EXPECT_EQ(device.logLines(),
            (Lines{"Merging inmem {a = 2} orig {} onDisk (null)", "merged to {a = 2}"}));
}

}  // namespace
}  // namespace accountsettings
