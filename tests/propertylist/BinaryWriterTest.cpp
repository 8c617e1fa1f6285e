#include <gtest/gtest.h>

#include <cmath>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace propertylist {
namespace {

using namespace std::string_literals;

// What is written, as text of hexadecimal digits.
std::string written(const Value& value) {
  const std::optional<Bytes> bytes = writeBinaryPropertyList(value);
  const std::string text = bytes ? describe(*bytes) : "<nothing>";
  return text.substr(1, text.size() - 2);
}

// The objects of a list whose offset table has entries of one byte.
std::string objectsOf(const Value& value) {
  const Bytes bytes = writeBinaryPropertyList(value).value();
  const std::size_t table = bytes.back();
  const std::string text =
      describe(Bytes(bytes.begin() + 8, bytes.begin() + static_cast<int>(table)));
  return text.substr(1, text.size() - 2);
}

TEST(BinaryWriter, WritesTheSameBytesEveryTime) {
  EXPECT_EQ(written(Dictionary{{"Version", 12}, {"Accounts", Array{"a", "a"}}}),
            "62706c6973743030"    // bplist00
            "d201020304"          // two keys, two values
            "584163636f756e7473"  // "Accounts"
            "5756657273696f6e"    // "Version"
            "a20505"              // the array
            "100c"                // 12
            "5161"                // "a", once
            "080d161e2123"        // offsets
            "000000000000"
            "01"
            "01"                  // sizes
            "0000000000000006"    // objects
            "0000000000000000"    // top
            "0000000000000025");  // offset table
}

TEST(BinaryWriter, WritesLeavesInTheirShortestForm) {
  const struct {
    const char* name;
    Value value;
    std::string objects;
  } kCases[] = {
      {"0", 0, "1000"},
      {"255", 255, "10ff"},
      {"256", 256, "110100"},
      {"65536", 65536, "1200010000"},
      {"2^32", 4294967296, "130000000100000000"},
      {"-1", -1, "13ffffffffffffffff"},
      {"2^63", 9223372036854775808U, "1400000000000000008000000000000000"},
      {"real", 1.5, "233ff8000000000000"},
      {"true", true, "09"},
      {"false", false, "08"},
      {"date", Date{4194304}, "334150000000000000"},
      {"data of 14 bytes", Bytes(14, 1), "4e0101010101010101010101010101"},
      {"data of 15 bytes", Bytes(15, 1), "4f100f010101010101010101010101010101"},
      {"ASCII", "hi", "526869"},
      {"UTF-16", "h\xC3\xA4", "62006800e4"},
      {"surrogate pair", "\xF0\x9F\x98\x80", "62d83dde00"},
      {"NUL", "a\0b"s, "53610062"},
      {"empty array", Array(), "a0"},
      {"empty dictionary", Dictionary(), "d0"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(objectsOf(c.value), c.objects);
  }
}

TEST(BinaryWriter, StoresEqualLeavesOnceAndContainersWhereTheyStand) {
  EXPECT_EQ(objectsOf(Array{"k", Dictionary{{"k", 5}}, 5, Dictionary{{"k", 5}}, Bytes{7}, Bytes{7},
                            1.5, 1.5, true, true, Date{0}, Date{0}}),
            "ac"
            "010203040505060607070808"  // the array
            "516b"                      // "k"
            "d10103"                    // {"k": 5}
            "1005"                      // 5
            "d10103"                    // {"k": 5}
            "4107"                      // data
            "233ff8000000000000"        // 1.5
            "09"                        // true
            "330000000000000000");      // date
}

TEST(BinaryWriter, KeepsLeavesApartThatAreNotEqual) {
  const Value value(Array{1, 1.0, true, Date{1.0}, "1", Bytes{'1'}, -1, 18446744073709551615U, 0.0,
                          -0.0, Date{0.0}, Date{-0.0}});
  EXPECT_EQ(readBinaryPropertyList(*writeBinaryPropertyList(value)).value, value);
}

TEST(BinaryWriter, GivesEqualBytesForEqualValuesHoweverTheyShare) {
  const Dictionary child{{"Type", "CardDAV"}, {"Long", std::string(200, 'x')}};
  const Value shared(Array{child, child, Array{child}});
  const Value apart(Array{Dictionary{{"Long", std::string(200, 'x')}, {"Type", "CardDAV"}},
                          Dictionary{{"Type", "CardDAV"}, {"Long", std::string(200, 'x')}},
                          Array{Dictionary{{"Type", "CardDAV"}, {"Long", std::string(200, 'x')}}}});
  EXPECT_EQ(written(shared), written(apart));
  const Value readBack = *readBinaryPropertyList(*writeBinaryPropertyList(shared)).value;
  EXPECT_EQ(written(readBack), written(shared));
}

TEST(BinaryWriter, StoresLongDataOnceWhetherSharedOrEqual) {
  const Value data(Bytes(1000, 7));
  const Value value(Array{data, data, Bytes(1000, 7)});
  const std::optional<Bytes> written = writeBinaryPropertyList(value);
  EXPECT_LT(written->size(), 1100U);
  EXPECT_EQ(readBinaryPropertyList(*written).value, value);
}

TEST(BinaryWriter, StoresLongTextsOnceHoweverManyLieBetween) {
  Array texts;
  for (int i = 0; i < 3000; ++i) texts.append(std::to_string(10000 + i) + std::string(95, 'x'));
  const Value value(Array{texts, texts});
  const std::optional<Bytes> written = writeBinaryPropertyList(value);
  EXPECT_LT(written->size(), 350000U);  // 100 bytes and some of each text
  EXPECT_EQ(readBinaryPropertyList(*written).value, value);
}

// Among so many the writer hashes some before it looks for the first.
TEST(BinaryWriter, WritesEqualTextsOnceAmongVeryMany) {
  constexpr std::size_t kTexts = 50'000;
  constexpr std::size_t kPlaces = 70'000;
  std::vector<Value> shared;
  for (std::size_t i = 0; i < kTexts; ++i) shared.emplace_back("text " + std::to_string(i));
  for (std::size_t i = kTexts; i < kPlaces; ++i) shared.push_back(shared[i - kTexts]);
  std::vector<Value> apart;
  for (const Value& text : shared) apart.emplace_back(std::string(*text.asString()));
  const Bytes written = *writeBinaryPropertyList(Array(apart));
  EXPECT_EQ(written.size(), 878'940U);
  EXPECT_EQ(*writeBinaryPropertyList(Array(shared)), written);
  EXPECT_EQ(readBinaryPropertyList(written).value, Value(Array(shared)));
}

TEST(BinaryWriter, WritesEqualScalarsOnceAmongVeryMany) {
  constexpr int kPlaces = 40'000;
  std::vector<Value> members;
  for (int i = 0; i < kPlaces; ++i) {
    members.emplace_back(i % 3 + 0.5);
    members.emplace_back(Date{static_cast<double>(i % 3)});
    members.emplace_back(i % 2 == 0);
    members.emplace_back(-(i % 3));
    members.emplace_back(Bytes{1});
    members.emplace_back(Array());
  }
  const Value value{Array(members)};
  const Bytes written = *writeBinaryPropertyList(value);
  EXPECT_EQ(readBinaryPropertyList(written).value, value);
  // The top array, the empty ones, and 12 others: three each of reals, dates and integers, two
  // booleans and one data.
  EXPECT_EQ(written[written.size() - 18], 40'013U >> 8U);
  EXPECT_EQ(written[written.size() - 17], 40'013U & 0xFFU);
}

TEST(BinaryWriter, WritesTextsOfOtherLettersOfEachLength) {
  EXPECT_EQ(objectsOf(Array{"\xC3\xA4\xC3\xB6", "\xC3\xBC"}),
            "a20102"
            "6200e400f6"
            "6100fc");
}

TEST(BinaryWriter, UsesTheSmallestSizesThatFit) {
  const struct {
    const char* name;
    std::size_t members;
    unsigned offsetSize, referenceSize;
  } kCases[] = {
      {"256 objects", 255, 2, 1},
      {"257 objects", 256, 2, 2},
      {"65,536 objects", 65535, 4, 2},
      {"65,537 objects", 65536, 4, 4},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    std::vector<Value> members;
    for (std::size_t i = 0; i < c.members; ++i) members.emplace_back(i);
    const Value value{Array(members)};
    const Bytes bytes = *writeBinaryPropertyList(value);
    EXPECT_EQ(bytes[bytes.size() - 26], c.offsetSize);
    EXPECT_EQ(bytes[bytes.size() - 25], c.referenceSize);
    EXPECT_EQ(readBinaryPropertyList(bytes).value, value);
  }
}

TEST(BinaryWriter, GivesNothingForWhatAReaderWouldRefuse) {
  const struct {
    const char* name;
    Value value;
  } kCases[] = {
      {"text that is no UTF-8", "\xFF"},
      {"surrogate in UTF-8", "\xED\xA0\x80"},
      {"overlong UTF-8", "\xC0\xAF"},
      {"overlong UTF-8 of three bytes", "\xE0\x80\xAF"},
      {"UTF-8 that is cut", "\xE2\x82"},
      {"beyond Unicode", "\xF4\x90\x80\x80"},
      {"key that is no UTF-8", Dictionary{{"\xFF", 1}}},
      {"text far inside", Array{Dictionary{{"a", Array{"\xFF"}}}}},
      {"date that is no number", Date{std::nan("")}},
      {"infinite date", Date{INFINITY}},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(writeBinaryPropertyList(c.value), std::nullopt);
    EXPECT_EQ(writeXMLPropertyList(c.value), std::nullopt);
  }
}

TEST(BinaryWriter, GivesNothingForAFileAboveTheLimit) {
  EXPECT_EQ(writeBinaryPropertyList(Bytes(std::size_t{256} << 20U)), std::nullopt);
}

TEST(BinaryWriter, WritesMoreThanAMillionValuesWhereTheFileHasAsManyBytes) {
  const Value value(Array(std::vector<Value>(1100, Array(std::vector<Value>(1000, 1)))));
  const std::optional<Bytes> bytes = writeBinaryPropertyList(value);
  ASSERT_TRUE(bytes.has_value());
  EXPECT_EQ(readBinaryPropertyList(*bytes).value, value);
}

}  // namespace
}  // namespace propertylist
