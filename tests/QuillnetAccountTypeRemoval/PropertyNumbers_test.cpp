#include "QuillnetAccountTypeRemoval/PropertyNumbers.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace accountsettings {
namespace {

using propertylist::Array;
using propertylist::Bytes;
using propertylist::Date;
using propertylist::Dictionary;
using propertylist::Value;

constexpr std::int64_t kLargest = std::numeric_limits<std::int64_t>::max();
constexpr std::int64_t kSmallest = std::numeric_limits<std::int64_t>::min();

TEST(IntegerValue, ReadsNumbersBooleansAndTheDigitsOfStrings) {
  const struct {
    const char* name;
    Value value;
    std::int64_t integer;
  } kCases[] = {
      {"one", 1, 1},
      {"negative", -7, -7},
      {"above the signed range", std::uint64_t{18446744073709551615U}, kLargest},
      {"true", true, 1},
      {"false", false, 0},
      {"real is cut", 2.9, 2},
      {"negative real is cut towards zero", -2.9, -2},
      {"small real", 0.99, 0},
      {"huge real", 1e300, kLargest},
      {"huge negative real", -1e300, kSmallest},
      {"2 to the 63", 9223372036854775808.0, kLargest},
      {"minus 2 to the 63", -9223372036854775808.0, kSmallest},
      {"no number", std::numeric_limits<double>::quiet_NaN(), 0},
      {"infinity", std::numeric_limits<double>::infinity(), kLargest},
      {"string one", "1", 1},
      {"blanks before", " \t\n 12", 12},
      {"plus", "+5", 5},
      {"minus", "-5", -5},
      {"digits only up to a letter", "12abc", 12},
      {"digits only up to a point", "1.9", 1},
      {"two signs", "--5", 0},
      {"blank after the sign", "- 5", 0},
      {"letters", "abc", 0},
      {"word", "true", 0},
      {"empty", "", 0},
      {"largest", "9223372036854775807", kLargest},
      {"smallest", "-9223372036854775808", kSmallest},
      {"one too large", "9223372036854775808", kLargest},
      {"one too small", "-9223372036854775809", kSmallest},
      {"very many digits", "99999999999999999999999999", kLargest},
      {"array", Array{1}, 0},
      {"dictionary", Dictionary{{"1", 1}}, 0},
      {"data", Bytes{'1'}, 0},
      {"date", Date{1}, 0},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(integerValue(&c.value), c.integer);
  }
}

TEST(IntegerValue, IsZeroForNothing) { EXPECT_EQ(integerValue(nullptr), 0); }

TEST(BooleanValue, IsTrueForNumbersOtherThanZeroAndAffirmativeWords) {
  const struct {
    const char* name;
    Value value;
    bool truth;
  } kCases[] = {
      {"true", true, true},
      {"false", false, false},
      {"one", 1, true},
      {"two", 2, true},
      {"minus one", -1, true},
      {"zero", 0, false},
      {"above the signed range", std::uint64_t{18446744073709551615U}, true},
      {"half", 0.5, true},
      {"real zero", 0.0, false},
      {"negative real zero", -0.0, false},
      {"YES", "YES", true},
      {"yes", "yes", true},
      {"y", "y", true},
      {"TRUE", "TRUE", true},
      {"true as a string", "true", true},
      {"string one", "1", true},
      {"string twelve", "12", true},
      {"zeros before a digit", "007", true},
      {"zeros before a word", "00yes", true},
      {"sign and digit", "-3", true},
      {"plus and digit", "+1", true},
      {"blanks before", "  \tYES", true},
      {"NO", "NO", false},
      {"false as a string", "false", false},
      {"on", "on", false},
      {"string zero", "0", false},
      {"string zeros", "000", false},
      {"sign alone", "-", false},
      {"blanks alone", "   ", false},
      {"empty", "", false},
      {"blank after the sign", "- 1", false},
      {"array", Array{true}, false},
      {"dictionary", Dictionary{{"YES", true}}, false},
      {"data", Bytes{'1'}, false},
      {"date", Date{1}, false},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(booleanValue(&c.value), c.truth);
  }
}

TEST(BooleanValue, IsFalseForNothing) { EXPECT_FALSE(booleanValue(nullptr)); }

}  // namespace
}  // namespace accountsettings
