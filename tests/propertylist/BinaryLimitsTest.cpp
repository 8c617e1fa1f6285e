// How many values, levels and bytes a binary property list may stand for.
#include <gtest/gtest.h>

#include "propertylist/Reading.h"
#include "tests/propertylist/BinaryList.h"

namespace propertylist {
namespace {

std::optional<Value> read(const BinaryList& list) {
  return readBinaryPropertyList(list.bytes()).value;
}

ReadError errorOf(const BinaryList& list) { return readBinaryPropertyList(list.bytes()).error; }

// An array of `outer` references to one array of `inner` references to one object.
BinaryList product(std::size_t outer, std::size_t inner, bool withOneMore) {
  std::vector<std::uint64_t> members(outer, 1);
  if (withOneMore) members.push_back(2);
  return {{container(0xA0, members.size(), members, 1),
           container(0xA0, inner, std::vector<std::uint64_t>(inner, 2), 1), "\x09"}};
}

TEST(BinaryLimits, ReadsAMillionSharedValuesAndNotOneMore) {
  // 1 + 999 * (1 + 1000) = 1,000,000
  EXPECT_TRUE(read(product(999, 1000, false)).has_value());
  EXPECT_EQ(read(product(999, 1000, true)), std::nullopt);
  EXPECT_EQ(errorOf(product(999, 1000, true)).what, "too many values");
  // The last members are containers.
  EXPECT_EQ(errorOf(product(1000, 1000, false)).what, "too many values");
}

TEST(BinaryLimits, RefusesAContainerThatFillsTheLimitAlone) {
  // 1 + 998 * (1 + 1001) + 3 = 1,000,000 in an array of its own, which is one more.
  BinaryList list = product(998, 1001, false);
  std::vector<std::uint64_t> members(998, 1);
  members.insert(members.end(), 3, 2);
  list.objects[0] = container(0xA0, members.size(), members, 1);
  EXPECT_TRUE(read(list).has_value());
  list.objects.push_back(container(0xA0, 1, {0}, 1));
  list.top = 3;
  EXPECT_EQ(read(list), std::nullopt);
  EXPECT_EQ(errorOf(list).what, "too many values");
}

TEST(BinaryLimits, ReadsAsManyValuesAsALargeFileHasBytes) {
  BinaryList list = product(999, 1000, true);
  list.objects.emplace_back(2000000, '\0');  // reached by nobody
  EXPECT_TRUE(read(list).has_value());
}

TEST(BinaryLimits, CountsTheDepthOfWhatIsSharedAtItsDeepestPlace) {
  // A chain of arrays, of which each holds the next; the first also holds the one at `first`.
  const auto chain = [](std::size_t levels, std::size_t first) {
    BinaryList list;
    list.referenceSize = 2;
    list.objects.push_back("\xA2" + bigEndian(first, 2) + bigEndian(1, 2));
    for (std::size_t i = 1; i < levels; ++i) {
      const bool isLast = i + 1 == levels;
      list.objects.push_back(isLast ? "\xA0" : "\xA1" + bigEndian(i + 1, 2));
    }
    return list;
  };
  for (const std::size_t first : {1U, 300U}) {
    SCOPED_TRACE(first);
    EXPECT_TRUE(read(chain(512, first)).has_value());
    EXPECT_EQ(read(chain(513, first)), std::nullopt);
    EXPECT_EQ(errorOf(chain(513, first)).what, "nested too deep");
  }
}

TEST(BinaryLimits, CountsTheLevelsOfContainersOnly) {
  // Arrays around true, each of three bytes.
  const auto arrays = [](std::size_t levels) {
    BinaryList list;
    list.referenceSize = 2;
    for (std::size_t i = 1; i <= levels; ++i) list.objects.push_back("\xA1" + bigEndian(i, 2));
    list.objects.emplace_back("\x09");
    return list;
  };
  EXPECT_TRUE(read(arrays(512)).has_value());
  EXPECT_EQ(errorOf(arrays(513)).what, "nested too deep");
  EXPECT_EQ(errorOf(arrays(513)).byteOffset, 8U + 512 * 3);
  EXPECT_EQ(errorOf(arrays(600)).byteOffset, 8U + 512 * 3);
}

TEST(BinaryLimits, CountsTheLevelsOfDictionaries) {
  // Dictionaries around true, each of five bytes; the key has the last number.
  const auto dictionaries = [](std::size_t levels) {
    BinaryList list;
    list.referenceSize = 2;
    for (std::size_t i = 1; i <= levels; ++i)
      list.objects.push_back("\xD1" + bigEndian(levels + 1, 2) + bigEndian(i, 2));
    list.objects.emplace_back("\x09");
    list.objects.emplace_back("\x51k");
    return list;
  };
  EXPECT_TRUE(read(dictionaries(512)).has_value());
  EXPECT_EQ(errorOf(dictionaries(513)).what, "nested too deep");
  EXPECT_EQ(errorOf(dictionaries(513)).byteOffset, 8U + 512 * 5);
}

TEST(BinaryLimits, RefusesObjectsThatOverlapWithoutMeasure) {
  // 20,000 data objects of 64 KiB each, all within 250 KB: each begins within the one before.
  constexpr std::size_t kCount = 20000;
  const std::string head = "\x4F\x12" + bigEndian(65536, 4);
  BinaryList list;
  std::vector<std::uint64_t> members;
  for (std::size_t i = 1; i <= kCount; ++i) members.push_back(i);
  list.referenceSize = 4;
  list.objects.push_back(container(0xA0, kCount, members, 4));
  const std::size_t start = 8 + list.objects[0].size();
  std::string overlapping;
  list.offsets.push_back(8);
  for (std::size_t i = 0; i < kCount; ++i) {
    list.offsets.push_back(start + overlapping.size());
    overlapping += head;
  }
  list.objects.push_back(overlapping + std::string(65536, 'x'));
  EXPECT_EQ(read(list), std::nullopt);
  EXPECT_EQ(errorOf(list).what, "objects that overlap without measure");
}

}  // namespace
}  // namespace propertylist
