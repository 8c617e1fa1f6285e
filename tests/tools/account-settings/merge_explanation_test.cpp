#include "tools/account-settings/MergeExplanation.h"

#include <gtest/gtest.h>

namespace tools {
namespace {

using propertylist::Dictionary;
using propertylist::Value;

struct KeyCase {
  const char* name;
  std::optional<Value> inMemory, original, onDisk, merged;
  Winner winner;
  const char* why;
};

Dictionary with(const std::optional<Value>& value) {
  Dictionary properties{{"Identifier", "A"}};
  if (value) properties.set("key", *value);
  return properties;
}

TEST(MergeExplanation, TellsWhatBecameOfAKey) {
  const std::optional<Value> none;
  const KeyCase kCases[] = {
      {"same", 1, 1, 1, 1, Winner::both, "unchanged"},
      {"memory", 2, 1, 1, 2, Winner::memory, "changed in memory only"},
      {"disk", 1, 1, 2, 2, Winner::disk, "changed on disk only"},
      {"both", 2, 1, 3, 2, Winner::memory, "changed on both: memory wins"},
      {"alike", 2, 1, 2, 2, Winner::both, "changed alike on both"},
      {"kind", 1, true, 1.0, 1, Winner::memory, "changed on both: memory wins"},
      {"memory new", 2, none, none, 2, Winner::memory, "added in memory only"},
      {"disk gone", 1, 1, none, none, Winner::disk, "deleted on disk only"},
      {"both gone", none, 1, none, none, Winner::both, "deleted alike on both"},
      {"gone and changed", none, 1, 2, none, Winner::memory,
       "deleted in memory, changed on disk: memory wins"},
      {"a wrong merge", 2, 1, 1, 1, Winner::disk, "changed in memory only"},
      {"a merge of neither", 2, 1, 3, 4, Winner::neither, "changed on both: memory wins"},
  };
  for (const KeyCase& c : kCases) {
    SCOPED_TRACE(c.name);
    const std::vector<MergeLine> lines =
        explainMerge({{"A", with(c.inMemory)}}, {{"A", with(c.original)}}, {{"A", with(c.onDisk)}},
                     {{"A", with(c.merged)}});
    ASSERT_EQ(lines.size(), 3U);
    EXPECT_EQ(lines[0].why, "merged key by key");
    EXPECT_EQ(lines[1].key, "Identifier");
    EXPECT_EQ(lines[2].key, "key");
    EXPECT_EQ(nameOf(lines[2].winner), nameOf(c.winner));
    EXPECT_EQ(lines[2].why, c.why);
    EXPECT_EQ(lines[2].value, c.merged);
  }
}

TEST(MergeExplanation, TellsWhatBecameOfAnAccount) {
  const auto account = [](const char* identifier) {
    return AccountVersion{identifier, Dictionary{{"Identifier", identifier}}};
  };
  const std::vector<MergeLine> lines = explainMerge(
      {account("M"), account("MO"), account("MD")}, {account("O"), account("MO"), account("OD")},
      {account("D"), account("MD"), account("OD")}, {account("M"), account("MO"), account("MD")});
  const struct {
    const char* account;
    Winner winner;
    const char* why;
  } kExpected[] = {
      {"M", Winner::memory, "added in memory only"},
      {"MO", Winner::memory, "deleted on disk, but still in memory: written as in memory"},
      {"MD", Winner::both, "added on both: written as in memory"},
      {"D", Winner::memory, "added on disk only: a save does not carry it over"},
      {"OD", Winner::memory, "deleted in memory: not written"},
      {"O", Winner::both, "deleted on both"},
  };
  ASSERT_EQ(lines.size(), std::size(kExpected));
  for (std::size_t i = 0; i < lines.size(); ++i) {
    SCOPED_TRACE(kExpected[i].account);
    EXPECT_EQ(lines[i].account, kExpected[i].account);
    EXPECT_EQ(lines[i].key, "");
    EXPECT_EQ(nameOf(lines[i].winner), nameOf(kExpected[i].winner));
    EXPECT_EQ(lines[i].why, kExpected[i].why);
  }
}

TEST(MergeExplanation, CountsAnEmptyOriginalAsNone) {
  const Dictionary one{{"a", 1}};
  const Dictionary two{{"a", 2}};
  const std::vector<MergeLine> lines =
      explainMerge({{"A", one}}, {{"A", Dictionary{}}}, {{"A", two}}, {{"A", one}});
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].why, "added on both: written as in memory");
}

}  // namespace
}  // namespace tools
