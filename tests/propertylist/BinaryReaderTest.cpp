#include <gtest/gtest.h>

#include <cmath>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"
#include "tests/propertylist/BinaryList.h"

namespace propertylist {
namespace {

using namespace std::string_literals;

std::optional<Value> read(const BinaryList& list) {
  return readBinaryPropertyList(list.bytes()).value;
}

ReadError errorOf(const BinaryList& list) { return readBinaryPropertyList(list.bytes()).error; }

// A list of one object.
BinaryList only(const std::string& raw) { return {{raw}}; }

TEST(BinaryReader, ReadsLeavesOfEveryTypeAndSize) {
  const struct {
    const char* name;
    std::string raw;
    Value value;
  } kCases[] = {
      {"false", "\x08", false},
      {"true", "\x09", true},
      {"1 byte, unsigned", "\x10\xFF", 255},
      {"2 bytes, unsigned", "\x11\xFF\xFE", 65534},
      {"4 bytes, unsigned", "\x12\xFF\xFF\xFF\xFF", 4294967295},
      {"8 bytes, signed", "\x13\xFF\xFF\xFF\xFF\xFF\xFF\xFF\xFF", -1},
      {"8 bytes, positive", "\x13\x7F\xFF\xFF\xFF\xFF\xFF\xFF\xFF", 9223372036854775807},
      {"16 bytes, unsigned", "\x14" + std::string(8, '\0') + std::string(8, '\xFF'),
       18446744073709551615U},
      {"16 bytes, small", "\x14" + std::string(15, '\0') + "\x07", 7},
      {"16 bytes, negative", "\x14" + std::string(16, '\xFF'), -1},
      {"small integer in 8 bytes", "\x13\0\0\0\0\0\0\0\x05"s, 5},
      {"4-byte real", "\x22\x3F\xC0\0\0"s, 1.5},
      {"8-byte real", "\x23\xC0\x02\0\0\0\0\0\0"s, -2.25},
      {"infinite real", "\x23\x7F\xF0\0\0\0\0\0\0"s, INFINITY},
      {"date", "\x33\x41\x50\0\0\0\0\0\0"s, Date{4194304}},
      {"data", "\x43\x01\x02\x03", Bytes{1, 2, 3}},
      {"empty data", "\x40", Bytes{}},
      {"ASCII", "\x52hi", "hi"},
      {"empty text", "\x50", ""},
      {"UTF-16", "\x61\x00\xE4"s, "\xC3\xA4"},
      {"UTF-16, surrogate pair", "\x62\xD8\x3D\xDE\x00"s, "\xF0\x9F\x98\x80"},
      {"long count in 1 byte", "\x5F\x10\x02hi", "hi"},
      {"long count in 8 bytes", "\x5F\x13\0\0\0\0\0\0\0\x02hi"s, "hi"},
      {"empty array", "\xA0", Array()},
      {"empty dictionary", "\xD0", Dictionary()},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const ReadResult result = readBinaryPropertyList(only(c.raw).bytes());
    ASSERT_TRUE(result.value.has_value()) << result.error.description();
    EXPECT_EQ(*result.value, c.value) << describe(*result.value);
  }
}

TEST(BinaryReader, RefusesWithThePlaceOfTheFault) {
  const struct {
    const char* name;
    BinaryList list;
    std::size_t byteOffset;
    const char* what;
  } kCases[] = {
      {"null", only("\x00"s), 8, "an object of an unknown type"},
      {"fill", only("\x0F"), 8, "an object of an unknown type"},
      {"UID", only("\x80\x01"), 8, "an object of an unknown type"},
      {"another text form", only("\x71x"), 8, "an object of an unknown type"},
      {"set", only("\xC0"), 8, "an object of an unknown type"},
      {"real of 16 bytes", only("\x24" + std::string(16, '\0')), 8, "an object of an unknown type"},
      {"real of 2 bytes", only("\x21\0\0"s), 8, "an object of an unknown type"},
      {"integer above 64 bits", only("\x14" + std::string(7, '\0') + "\x01" + std::string(8, '\0')),
       8, "an integer of more than 64 bits"},
      {"integer above 64 bits with the highest bit of 64",
       only("\x14" + std::string(7, '\0') + "\x01\x80" + std::string(7, '\0')), 8,
       "an integer of more than 64 bits"},
      {"negative integer below 64 bits",
       only("\x14" + std::string(8, '\xFF') + "\x7F" + std::string(7, '\xFF')), 8,
       "an integer of more than 64 bits"},
      {"infinite date", only("\x33\x7F\xF0\0\0\0\0\0\0"s), 8, "a date that is no instant"},
      {"ASCII above 7 bits", only("\x53zz\x80"), 11, "a character that is not ASCII"},
      {"high surrogate at the end", only("\x61\xD8\x3D"), 8, "half of a surrogate pair"},
      {"two high surrogates", only("\x63\xD8\x3D\xD8\x3D\xDE\0"s), 11, "half of a surrogate pair"},
      {"high surrogate before what is none", only("\x62\xD8\x3D\xFF\x21"), 11,
       "half of a surrogate pair"},
      {"low surrogate first", only("\x61\xDE\0"s), 9, "half of a surrogate pair"},
      {"integer without its bytes", only("\x13\x01"), 8,
       "an object that does not end before the offset table"},
      {"date without its bytes", only("\x33\x41"), 8,
       "an object that does not end before the offset table"},
      {"real of 4 bytes without them", only("\x22\x3F"), 8,
       "an object that does not end before the offset table"},
      {"real of 8 bytes without them", only("\x23\x3F"), 8,
       "an object that does not end before the offset table"},
      {"count without its bytes", only("\x5F\x13\x01"), 9, "a count outside of its region"},
      {"count of UTF-16 without its bytes", only("\x6F\x13\x01"), 9,
       "a count outside of its region"},
      {"count of data without its bytes", only("\x4F\x13\x01"), 9, "a count outside of its region"},
      {"count of an array without its bytes", only("\xAF\x13\x01"), 9,
       "a count outside of its region"},
      {"count of a dictionary without its bytes", only("\xDF\x13\x01"), 9,
       "a count outside of its region"},
      {"UTF-16 without its bytes", only("\x62\0x"s), 8,
       "an object that does not end before the offset table"},
      {"array without its members", only("\xA2\0"s), 8,
       "an object that does not end before the offset table"},
      {"count as a 16-byte integer", only("\x5F\x14" + std::string(15, '\0') + "\x01z"), 9,
       "a count that is no integer"},
      {"negative count", only("\x4F\x13" + std::string(8, '\xFF') + "z"), 8,
       "an object that does not end before the offset table"},
      {"pairs whose number wraps", only("\xDF\x13\x80" + std::string(7, '\0')), 8,
       "an object that does not end before the offset table"},
      {"dictionary without its values", only("\xD1\x01"), 8,
       "an object that does not end before the offset table"},
      {"reference to nothing",
       {{"\xA1\x02", "\x09"}},
       9,
       "a reference to an object that does not exist"},
      {"key that is a dictionary",
       {{"\xD1\x01\x02", "\xD0", "\x09"}},
       9,
       "a key that is no string"},
      {"key that is the dictionary itself",
       {{"\xD1\x00\x01"s, "\x09"}},
       9,
       "a key that is no string"},
      {"dictionary that is its own value",
       {{"\xD1\x01\x00"s, "\x51k"}},
       10,
       "an object that contains itself"},
      {"circle of three",
       {{"\xA1\x01", "\xA1\x02", "\xA1\x00"s}},
       13,
       "an object that contains itself"},
      {"offset in the magic", {{"\x09"}, 1, 1, 0, {7}}, 9, "an object outside of its region"},
      {"offset at the table", {{"\x09"}, 1, 1, 0, {9}}, 9, "an object outside of its region"},
      {"top above the count", {{"\x09"}, 1, 1, 1}, 26, "no such top object"},
      {"count where the table begins", only("\x5F"), 9, "a count outside of its region"},
      {"count that is true", only("\x5F\x09z"), 9, "a count that is no integer"},
      {"offset size of 0", {{"\x09"}, 0}, 15, "bad offset size"},
      {"offset size of 9", {{"\x09"}, 9}, 24, "bad offset size"},
      {"reference size of 0", {{"\x09"}, 1, 0}, 17, "bad reference size"},
      {"reference size of 9", {{"\x09"}, 1, 9}, 17, "bad reference size"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(read(c.list), std::nullopt);
    const ReadError error = errorOf(c.list);
    EXPECT_EQ(error.what, c.what);
    EXPECT_EQ(error.byteOffset, c.byteOffset);
    EXPECT_EQ(error.line, std::nullopt);
  }
}

TEST(BinaryReader, LooksAtEachByteOfAnASCIIText) {
  const std::string letters = "abcdefghijklmnopqrstuvwxyz";
  for (std::size_t size = 0; size <= letters.size(); ++size) {
    const std::string text = letters.substr(0, size);
    const std::string head = "\x5F\x10" + std::string(1, static_cast<char>(size));
    // What comes behind the text is not ASCII, and refused for something else.
    const BinaryList good = {{"\xA2\x01\x02", head + text, "\x82\xFF\xFF\xFF"}};
    EXPECT_EQ(errorOf(good).what, "an object of an unknown type") << size;
    EXPECT_EQ(read(only(head + text)), Value(text)) << size;
    for (std::size_t at = 0; at < size; ++at) {
      std::string bad = text;
      bad[at] = '\x80';
      EXPECT_EQ(errorOf(only(head + bad)).byteOffset, 11 + at) << size;
    }
  }
}

TEST(BinaryReader, TakesUnitsOfEverySizeInOneText) {
  // The last ones of one, two and three bytes of UTF-8, and the first of the next size.
  const BinaryList list = only("\x67\0\x7F\0\x80\x07\xFF\x08\0\xD7\xFF\xE0\0\xFF\xFF"s);
  EXPECT_EQ(read(list),
            Value("\x7F\xC2\x80\xDF\xBF\xE0\xA0\x80\xED\x9F\xBF\xEE\x80\x80\xEF\xBF\xBF"));
}

TEST(BinaryReader, RefusesATrailerThatDoesNotFit) {
  // An object at 8, a table of four bytes at 9, the trailer at 13.
  const struct {
    const char* name;
    std::size_t at;
    std::uint8_t number;
    std::size_t byteOffset;
    const char* what;
  } kCases[] = {
      {"no object", 28, 0, 21, "object count does not fit the offset table"},
      {"more objects than the table has room for", 28, 2, 21,
       "object count does not fit the offset table"},
      {"a table in the place of all objects", 44, 8, 37, "offset table out of place"},
      {"a table behind its end", 44, 14, 37, "offset table out of place"},
      {"a table without room", 44, 13, 21, "object count does not fit the offset table"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    Bytes bytes = only("\x09").bytes();
    bytes[c.at] = c.number;
    const ReadResult result = readBinaryPropertyList(bytes);
    EXPECT_EQ(result.value, std::nullopt);
    EXPECT_EQ(result.error.what, c.what);
    EXPECT_EQ(result.error.byteOffset, c.byteOffset);
  }
}

TEST(BinaryReader, RefusesNothingAtAll) {
  const ReadError error = readBinaryPropertyList({}).error;
  EXPECT_EQ(error.what, "not a binary property list of a known version");
  EXPECT_EQ(error.byteOffset, 0U);
}

TEST(BinaryReader, KnowsTheTypesThatPropertyListsHave) {
  const auto isKnown = [](unsigned marker) {
    switch (marker >> 4U) {
      case 0x0:
        return marker == 0x08 || marker == 0x09;
      case 0x1:
        return marker <= 0x14;
      case 0x2:
        return marker == 0x22 || marker == 0x23;
      case 0x3:
        return marker == 0x33;
      case 0x4:
      case 0x5:
      case 0x6:
      case 0xA:
      case 0xD:
        return true;
      default:
        return false;
    }
  };
  for (unsigned marker = 0; marker < 256; ++marker) {
    SCOPED_TRACE(marker);
    const std::string raw = static_cast<char>(marker) + std::string(64, '\0');
    EXPECT_EQ(errorOf(only(raw)).what != "an object of an unknown type", isKnown(marker));
  }
}

TEST(BinaryReader, DescribesAnErrorWithItsByte) {
  EXPECT_EQ(errorOf(only("\x80\x01")).description(), "an object of an unknown type at byte 8");
}

TEST(BinaryReader, KeepsRepeatedObjectsShared) {
  // {"k": [{"k": "v"}, {"k": "v"}, "v"]}, in which both dictionaries are one object
  const Value value =
      *read({{"\xD1\x01\x02", "\x51k", "\xA3\x03\x03\x04", "\xD1\x01\x04", "\x51v"}});
  EXPECT_EQ(value,
            Value(Dictionary{{"k", Array{Dictionary{{"k", "v"}}, Dictionary{{"k", "v"}}, "v"}}}));
  const Array& array = *findArray(*value.asDictionary(), "k");
  const Dictionary& first = *array[0].asDictionary();
  EXPECT_TRUE(first.sharesStorageWith(*array[1].asDictionary()));
  EXPECT_EQ(first.find("k")->asString(), array[2].asString());
  EXPECT_EQ(&first.begin()->key(), &value.asDictionary()->begin()->key());
}

TEST(BinaryReader, SortsKeysAndKeepsTheLastOfEqualOnes) {
  // The keys b, a, a, b, where the second b is an object of its own.
  const BinaryList list{{"\xD4\x01\x02\x02\x03\x04\x05\x06\x07",
                         "\x51"
                         "b",
                         "\x51"
                         "a",
                         "\x51"
                         "b",
                         "\x10\x01", "\x10\x02", "\x10\x03", "\x10\x04"}};
  EXPECT_EQ(*read(list), Value(Dictionary{{"a", 3}, {"b", 4}}));
}

TEST(BinaryReader, SortsLongKeysAndKeepsTheLastOfEqualOnes) {
  // The same, of keys that are compared by their places among all long ones.
  const std::string start(64, 'k');
  const auto text = [&](char end) { return object(0x5F, "\x10\x41" + start + end); };
  const BinaryList list{{"\xD4\x01\x02\x02\x03\x04\x05\x06\x07", text('b'), text('a'), text('b'),
                         "\x10\x01", "\x10\x02", "\x10\x03", "\x10\x04"}};
  EXPECT_EQ(*read(list), Value(Dictionary{{start + "a", 3}, {start + "b", 4}}));
}

TEST(BinaryReader, TakesAKeyThatIsAValueToo) {
  EXPECT_EQ(*read({{"\xD1\x01\x01", "\x51k"}}), Value(Dictionary{{"k", "k"}}));
}

TEST(BinaryReader, TakesEveryReferenceSize) {
  for (std::uint8_t size = 1; size <= 8; ++size) {
    SCOPED_TRACE(size);
    BinaryList list{{"\xA2" + bigEndian(1, size) + bigEndian(2, size), "\x09", "\x51x"}};
    list.referenceSize = size;
    list.offsetSize = size;
    EXPECT_EQ(*read(list), Value(Array{true, "x"}));
  }
}

TEST(BinaryReader, TakesTwoNumbersOfOneObject) {
  EXPECT_EQ(*read({{"\xA2\x01\x02", "\x51x"}, 1, 1, 0, {8, 11, 11}}), Value(Array{"x", "x"}));
}

TEST(BinaryReader, LooksOnlyAtObjectsThatAreReached) {
  EXPECT_EQ(*read({{"\xA1\x02", "\x80", "\x09"}}), Value(Array{true}));
  EXPECT_EQ(*read({{"\x09"}, 1, 1, 0, {8, 200}}), Value(true));
}

TEST(BinaryReader, SortsManyDictionariesWithAFewLongKeysByTheKeysOnce) {
  // 2,000 dictionaries that share 64 keys of 16 KiB, equal but for their last two bytes. Comparing
  // the texts in each dictionary would take gigabytes of comparisons; the result shows that it is
  // right.
  constexpr std::size_t kKeys = 64;
  constexpr std::size_t kDictionaries = 2000;
  BinaryList list;
  list.referenceSize = 2;
  std::vector<std::uint64_t> dictionaries;
  for (std::size_t i = 0; i < kDictionaries; ++i) dictionaries.push_back(2 + kKeys + i);
  list.objects.push_back(container(0xA0, kDictionaries, dictionaries, 2));
  list.objects.emplace_back("\x09");
  for (std::size_t i = 0; i < kKeys; ++i) {
    const std::string text = std::string(16384, 'k') + std::to_string(99 - i);
    list.objects.push_back(object(0x5F, object(0x12, bigEndian(text.size(), 4)) + text));
  }
  std::vector<std::uint64_t> references;
  for (std::size_t i = 0; i < kKeys; ++i) references.push_back(2 + i);
  references.resize(2 * kKeys, 1);
  for (std::size_t i = 0; i < kDictionaries; ++i) {
    list.objects.push_back(container(0xD0, kKeys, references, 2));
  }
  const std::optional<Value> value = read(list);
  ASSERT_TRUE(value.has_value());
  const Dictionary& dictionary = *(*value->asArray())[kDictionaries - 1].asDictionary();
  ASSERT_EQ(dictionary.size(), kKeys);
  EXPECT_EQ(dictionary.begin()->key().substr(16384), "36");
  EXPECT_EQ((dictionary.end() - 1)->key().substr(16384), "99");
}

TEST(BinaryReader, RefusesEveryPrefixOfAGoodList) {
  const Bytes good = *writeBinaryPropertyList(
      Dictionary{{"Accounts", Array{Dictionary{{"Type", "CalDAV"}}}}, {"Version", 12}});
  for (std::size_t size = 0; size < good.size(); ++size) {
    const Bytes cut(good.begin(), good.begin() + static_cast<std::ptrdiff_t>(size));
    EXPECT_EQ(readPropertyList(cut).value, std::nullopt) << size;
  }
}

TEST(BinaryReader, GivesAValueOrAnErrorForEveryChangeOfAByte) {
  const Bytes good = *writeBinaryPropertyList(
      Dictionary{{"a", Array{1, -1, 2.5, true, Date{1}, Bytes{1, 2}}}, {"\xC3\xA4", "text"}});
  for (std::size_t at = 0; at < good.size(); ++at) {
    for (unsigned byte = 0; byte < 256; ++byte) {
      Bytes changed = good;
      changed[at] = static_cast<std::uint8_t>(byte);
      const ReadResult result = readBinaryPropertyList(changed);
      EXPECT_NE(result.value.has_value(), !result.error.what.empty()) << at << " " << byte;
    }
  }
}

}  // namespace
}  // namespace propertylist
