#include "QuillnetAccountTypeRemoval/IdentifierTable.h"

#include <gtest/gtest.h>

#include <array>
#include <map>
#include <set>
#include <string>
#include <vector>

namespace accountsettings {
namespace {

using Table = IdentifierTable<int>;

std::vector<std::string> entriesOf(const Table& table) {
  std::vector<std::string> entries;
  for (const auto& [identifier, value] : table)
    entries.push_back(std::string(identifier) + "=" + std::to_string(value));
  return entries;
}

using Entries = std::vector<std::string>;

TEST(IdentifierTable, HasNothingAtFirst) {
  const Table table;
  EXPECT_TRUE(table.empty());
  EXPECT_EQ(table.find("a"), nullptr);
  EXPECT_EQ(table.find(""), nullptr);
  EXPECT_EQ(entriesOf(table), Entries());
}

TEST(IdentifierTable, AnswersWhatWasPutUnderAnIdentifier) {
  Table table;
  table.set("b", 2);
  table.set("a", 1);
  table.set("", 3);
  table.set(std::string_view("a\0b", 3), 4);
  EXPECT_EQ(table.size(), 4U);
  EXPECT_EQ(table.at("b"), 2);
  EXPECT_EQ(table.at("a"), 1);
  EXPECT_EQ(table.at(""), 3);
  EXPECT_EQ(table.at(std::string_view("a\0b", 3)), 4);
  EXPECT_FALSE(table.contains("ab"));
}

TEST(IdentifierTable, IsVisitedInTheOrderInWhichTheIdentifiersCame) {
  Table table;
  table.set("b", 1);
  table.set("a", 2);
  table.set("b", 3);
  EXPECT_EQ(entriesOf(table), (Entries{"b=3", "a=2"}));
}

// Whatever lies where their hashes put them, and however often it went and came.
TEST(IdentifierTable, FindsWhatIsThereAfterAnyRemovals) {
  constexpr int kIdentifiers = 300;
  Table table;
  std::set<int> there;
  unsigned random = 1;
  for (int step = 0; step < 100'000; ++step) {
    random = random * 1664525U + 1013904223U;
    const int number = static_cast<int>(random >> 16U) % kIdentifiers;
    const std::string identifier(static_cast<std::size_t>(number), 'a');
    if ((random >> 8U & 1U) != 0) {
      table.set(identifier, number);
      there.insert(number);
    } else {
      table.remove(identifier);
      there.erase(number);
    }
    ASSERT_EQ(table.contains(identifier), there.contains(number));
    ASSERT_EQ(table.size(), there.size());
  }
  for (int number = 0; number < kIdentifiers; ++number) {
    const int* const found = table.find(std::string(static_cast<std::size_t>(number), 'a'));
    ASSERT_EQ(found != nullptr ? *found : -1, there.contains(number) ? number : -1);
  }
}

TEST(IdentifierTable, ForgetsWhatIsRemovedAndHasItLastWhenItComesAgain) {
  Table table;
  table.set("a", 1);
  table.set("b", 2);
  table.remove("a");
  table.remove("a");
  table.remove("nobody");
  EXPECT_EQ(table.size(), 1U);
  EXPECT_EQ(table.find("a"), nullptr);
  EXPECT_EQ(entriesOf(table), Entries{"b=2"});
  table.set("a", 3);
  EXPECT_EQ(entriesOf(table), (Entries{"b=2", "a=3"}));
}

TEST(IdentifierTable, KeepsTheOthersHoweverOftenOneGoesAndComes) {
  Table table;
  for (int i = 0; i < 100; ++i) table.set("kept " + std::to_string(i), i);
  for (int i = 0; i < 10'000; ++i) {
    table.set("passing", i);
    table.remove("passing");
  }
  ASSERT_EQ(table.size(), 100U);
  for (int i = 0; i < 100; ++i) EXPECT_EQ(table.at("kept " + std::to_string(i)), i);
  EXPECT_EQ(entriesOf(table).front(), "kept 0=0");
}

Table sameAs(const Table& table) {
  return table.withValues<int>([](int value) { return value; });
}

TEST(IdentifierTable, IsNotChangedByChangesOfATableThatWasMadeFromIt) {
  Table table;
  table.set("a", 1);
  table.set("b", 2);
  Table other = sameAs(table);
  other.remove("a");
  other.set("b", 3);
  EXPECT_EQ(entriesOf(other), Entries{"b=3"});
  other.set("c", 4);
  other.set("a", 5);
  EXPECT_EQ(entriesOf(other), (Entries{"b=3", "c=4", "a=5"}));
  EXPECT_EQ(other.at("a"), 5);
  EXPECT_EQ(entriesOf(table), (Entries{"a=1", "b=2"}));
  EXPECT_EQ(table.at("a"), 1);
  EXPECT_EQ(table.find("c"), nullptr);
}

TEST(IdentifierTable, ChangesWithoutTheTableThatWasMadeFromIt) {
  Table table;
  table.set("a", 1);
  table.set("b", 2);
  table.remove("b");
  const Table other = sameAs(table);
  table.remove("a");
  table.set("b", 3);
  table.set("a", 4);
  EXPECT_EQ(entriesOf(table), (Entries{"b=3", "a=4"}));
  EXPECT_EQ(entriesOf(other), Entries{"a=1"});
  EXPECT_EQ(other.find("b"), nullptr);
}

// Two tables, one of which is made anew from the other one now and then.
TEST(IdentifierTable, FindsWhatIsThereAfterAnyChangesOfTwoThatShare) {
  constexpr int kIdentifiers = 40;
  std::array<Table, 2> tables;
  std::array<std::map<std::string, int>, 2> models;
  unsigned random = 1;
  for (int step = 0; step < 100'000; ++step) {
    random = random * 1664525U + 1013904223U;
    const std::string identifier = "account " + std::to_string((random >> 16U) % kIdentifiers);
    const std::size_t side = random >> 8U & 1U;
    const unsigned action = random >> 9U & 15U;
    if (action == 0) {
      tables[side] = sameAs(tables[1 - side]);
      models[side] = models[1 - side];
    } else if (action < 8) {
      tables[side].set(identifier, step);
      models[side][identifier] = step;
    } else {
      tables[side].remove(identifier);
      models[side].erase(identifier);
    }
    for (std::size_t i = 0; i < 2; ++i) {
      const int* const found = tables[i].find(identifier);
      ASSERT_EQ(found != nullptr, models[i].contains(identifier));
      if (found != nullptr) {
        ASSERT_EQ(*found, models[i].at(identifier));
      }
      ASSERT_EQ(tables[i].size(), models[i].size());
    }
  }
}

// How often a value was copied since the last count.
struct Counted {
  Counted() = default;
  Counted(const Counted& /*other*/) { ++copies; }
  Counted(Counted&& /*other*/) noexcept {}
  Counted& operator=(const Counted& /*other*/) {
    ++copies;
    return *this;
  }
  Counted& operator=(Counted&& /*other*/) noexcept { return *this; }
  ~Counted() = default;
  static inline int copies = 0;
};

TEST(IdentifierTable, TakesAnIdentifierThatLiesInItself) {
  const std::string longName(5000, 'a');
  Table table;
  table.set(longName, 1);
  table.set("b", 2);
  const std::string_view itself = (*table.begin()).first;
  table.remove(itself);
  table.set(itself, 3);
  EXPECT_EQ(entriesOf(table), (Entries{"b=2", longName + "=3"}));
}

TEST(IdentifierTable, CopiesNoValueWhenOneGoesAndComes) {
  IdentifierTable<Counted> table;
  for (int i = 0; i < 3; ++i) table.set("kept " + std::to_string(i), Counted());
  for (int i = 0; i < 1000; ++i) {
    table.set("passing", Counted());
    table.remove("passing");
  }
  EXPECT_EQ(Counted::copies, 0);
}

TEST(IdentifierTable, KeepsWhatItHasWhenRoomIsMade) {
  Table table;
  table.set("a", 1);
  table.reserve(1000);
  table.set("b", 2);
  EXPECT_EQ(entriesOf(table), (Entries{"a=1", "b=2"}));
  table.clear();
  EXPECT_TRUE(table.empty());
  EXPECT_EQ(table.find("a"), nullptr);
}

}  // namespace
}  // namespace accountsettings
