#include "host/Settings.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

using propertylist::Dictionary;
using propertylist::Value;

namespace host {
namespace {

TEST(IntegerValue, IsWhatTheAccountFrameworkReads) {
  struct Case {
    const char* name;
    Value value;
    std::int64_t integer;
  };
  const Case kCases[] = {
      {"an integer", 7, 7},
      {"a negative integer", -7, -7},
      {"an integer above the signed range", std::numeric_limits<std::uint64_t>::max(),
       9223372036854775807},
      {"true", true, 1},
      {"false", false, 0},
      {"a real is cut", 1.99, 1},
      {"a negative real is cut towards zero", -1.99, -1},
      {"a real that is no number", std::numeric_limits<double>::quiet_NaN(), 0},
      {"a real beyond the range", 1e300, 9223372036854775807},
      {"a real below the range", -1e300, std::numeric_limits<std::int64_t>::min()},
      {"digits", "1", 1},
      {"digits with blanks in front", " \t12", 12},
      {"digits with something behind", "1abc", 1},
      {"a sign", "-3", -3},
      {"a plus", "+3", 3},
      {"two signs", "+-3", 0},
      {"letters", "abc", 0},
      {"nothing", "", 0},
      {"blanks", "  ", 0},
      {"digits beyond the range", "99999999999999999999", 9223372036854775807},
      {"the largest number", "9223372036854775807", 9223372036854775807},
      {"one above it", "9223372036854775808", 9223372036854775807},
      {"the smallest number", "-9223372036854775808", std::numeric_limits<std::int64_t>::min()},
      {"a date", propertylist::Date{1}, 0},
      {"data", propertylist::Bytes{1}, 0},
      {"an array", propertylist::Array{1}, 0},
      {"a dictionary", Dictionary{{"1", 1}}, 0},
  };
  for (const Case& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(integerValue(&c.value), c.integer);
  }
  EXPECT_EQ(integerValue(nullptr), 0);
}

TEST(Selection, CoversAnAccountOfItsTypeAndStatusOnly) {
  const Selection selection = {"Status", {{{"Quillnet", "VantorAccount"}, 1}}};
  EXPECT_TRUE(selection.covers({{"Type", "Quillnet"}, {"Status", 1}}));
  EXPECT_TRUE(selection.covers({{"Type", "VantorAccount"}, {"Status", "1"}}));
  EXPECT_FALSE(selection.covers({{"Type", "Quillnet"}, {"Status", 2}}));
  EXPECT_FALSE(selection.covers({{"Type", "Quillnet"}}));
  EXPECT_FALSE(selection.covers({{"Type", "quillnet"}, {"Status", 1}}));
  EXPECT_FALSE(selection.covers({{"Type", "Mail"}, {"Status", 1}}));
  EXPECT_FALSE(selection.covers({{"Status", 1}}));
}

TEST(Selection, OfNoMigratorCoversNothing) {
  EXPECT_FALSE(Selection{}.covers({{"Type", "Quillnet"}, {"QuillnetStatus", 1}}));
}

}  // namespace
}  // namespace host
