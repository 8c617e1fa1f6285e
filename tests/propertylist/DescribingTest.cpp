#include <gtest/gtest.h>

#include <sys/resource.h>

#include <cmath>
#include <cstdint>

#include "propertylist/Writing.h"

namespace propertylist {
namespace {

TEST(Description, IsTheBareTextOrTheNumbersOfALeaf) {
  const struct {
    const char* name;
    Value value;
    const char* text;
  } kCases[] = {
      {"text", "a %@ b", "a %@ b"},
      {"empty text", "", ""},
      {"integer", 42, "42"},
      {"negative integer", -42, "-42"},
      {"largest integer", 18446744073709551615U, "18446744073709551615"},
      {"whole real", 3.0, "3"},
      {"real", 0.1, "0.1"},
      {"negative real", -2.25, "-2.25"},
      {"large real", 1e300, "1e+300"},
      {"infinite real", -INFINITY, "-inf"},
      {"true", true, "1"},
      {"false", false, "0"},
      {"start of dates", Date{0}, "2001-01-01T00:00:00Z"},
      {"date in a leap year", Date{3600.0 * 24 * (365 * 3 + 59) + 3661}, "2004-02-29T01:01:01Z"},
      {"date before the start", Date{-978307200}, "1970-01-01T00:00:00Z"},
      {"part of a second before the start", Date{-0.25}, "2000-12-31T23:59:59Z"},
      {"first date of four digits", Date{-63113904000}, "0001-01-01T00:00:00Z"},
      {"last date of four digits", Date{252423993599}, "9999-12-31T23:59:59Z"},
      {"date after the year 9999", Date{252423993600},
       "252423993600 seconds since 2001-01-01T00:00:00Z"},
      {"date before the year 1", Date{-63113904001},
       "-63113904001 seconds since 2001-01-01T00:00:00Z"},
      {"date that is no number", Date{std::nan("")}, "nan seconds since 2001-01-01T00:00:00Z"},
      {"data", Bytes{0x00, 0x1F, 0xA0}, "<001fa0>"},
      {"empty data", Bytes{}, "<>"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(describe(c.value), c.text);
  }
}

TEST(Description, ListsMembersAndSortedKeys) {
  EXPECT_EQ(describe(Array()), "()");
  EXPECT_EQ(describe(Dictionary()), "{}");
  EXPECT_EQ(describe(Array{"a"}), "(a)");
  EXPECT_EQ(describe(Array{"a", 1, Array{2, 3}}), "(a, 1, (2, 3))");
  EXPECT_EQ(describe(Dictionary{{"b", 1}}), "{b = 1}");
  EXPECT_EQ(describe(Dictionary{{"b", Array{1}}, {"a", Dictionary{{"c", true}}}}),
            "{a = {c = 1}; b = (1)}");
}

TEST(Description, IsCutWhenItIsTooLong) {
  const std::string longest(kMaximumDescription, 'x');
  EXPECT_EQ(describe(longest), longest);
  EXPECT_EQ(describe(longest + "y"), longest + "...");
  EXPECT_EQ(describe(Array{longest, "y"}), "(" + longest.substr(1) + "...");
}

TEST(Description, IsCutBetweenCharacters) {
  const struct {
    const char* name;
    Value value;
    std::size_t limit;
    const char* text;
  } kCases[] = {
      {"it fits", "a\u00e9", 3, "a\u00e9"},
      {"inside of a character of two bytes", "a\u00e9b", 2, "a..."},
      {"behind one", "a\u00e9b", 3, "a\u00e9..."},
      {"inside of a character of three bytes", "\u20ac\u20ac", 5, "\u20ac..."},
      {"inside of a character of four bytes", "a\U0001F600", 4, "a..."},
      {"inside of the only character", "\U0001F600", 3, "..."},
      {"inside of a key", Dictionary{{"\u20ac", 1}}, 2, "{..."},
      {"inside of data", Bytes{0x12, 0x34}, 4, "<123..."},
      {"before the bracket", Array{"ab"}, 3, "(ab..."},
      {"in bytes that are no characters", "\x80\x80\x80\x80\x80\x80", 5, "\x80\x80\x80\x80\x80..."},
      {"everything", "ab", 0, "..."},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(describe(c.value, c.limit), c.text);
  }
}

TEST(Description, OfNothingIsNeverLongerThanTheLongest) {
  const std::string longest(kMaximumDescription, 'x');
  EXPECT_TRUE(describe(longest + "y", SIZE_MAX) == longest + "...");
}

// The most memory that this process has had so far, in KiB.
long peakMemory() {
  struct rusage usage {};
  EXPECT_EQ(::getrusage(RUSAGE_SELF, &usage), 0);
  return usage.ru_maxrss;
}

TEST(Description, TakesNoMoreMemoryThanItsLongestWhateverTheValueHas) {
  constexpr std::size_t kSize = std::size_t{160} << 20U;
  const struct {
    const char* name;
    Value value;
  } kCases[] = {
      {"a text", std::string(kSize, 'x')},
      {"data", Bytes(kSize, 0x12)},
      {"a key", Dictionary{{std::string(kSize, 'x'), 1}}},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const long before = peakMemory();
    EXPECT_EQ(describe(c.value).size(), kMaximumDescription + 3);
    EXPECT_LT(peakMemory() - before, 120L << 10U);
  }
}

}  // namespace
}  // namespace propertylist
