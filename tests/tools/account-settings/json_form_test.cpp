#include "tools/account-settings/JsonForm.h"

#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <limits>
#include <random>

namespace tools {
namespace {

using propertylist::Array;
using propertylist::Bytes;
using propertylist::Date;
using propertylist::Dictionary;
using propertylist::Value;

struct FormCase {
  const char* name;
  Value value;
  const char* text;  // without the line end
};

const FormCase kForms[] = {
    {"string", "Zo\xC3\xAB \"x\"\n", R"("Zoë \"x\"\n")"},
    {"string with a NUL", std::string(1, '\0'), R"("\u0000")"},
    {"true", true, "true"},
    {"false", false, "false"},
    {"smallest integer", std::numeric_limits<std::int64_t>::min(), "-9223372036854775808"},
    {"largest integer", std::numeric_limits<std::uint64_t>::max(), "18446744073709551615"},
    {"whole real", 1.0, "1.0"},
    {"zero", 0.0, "0.0"},
    {"minus zero", -0.0, "-0.0"},
    {"large real", 1e300, "1e+300"},
    {"tenth", 0.1, "0.1"},
    {"smallest real", 5e-324, "5e-324"},
    {"infinite", std::numeric_limits<double>::infinity(), R"({"@real": "inf"})"},
    {"minus infinite", -std::numeric_limits<double>::infinity(), R"({"@real": "-inf"})"},
    {"not a number", std::bit_cast<double>(0x7FF8000000000000U), R"({"@real": "nan"})"},
    {"not a number with bits", std::bit_cast<double>(0xFFF8000000000001U),
     R"({"@real": "nan:fff8000000000001"})"},
    {"date", Date{0}, R"({"@date": "2001-01-01T00:00:00Z"})"},
    {"date with a fraction", Date{0.25}, R"({"@date": "2001-01-01T00:00:00.25Z"})"},
    {"date before 2001", Date{-0.25}, R"({"@date": "2000-12-31T23:59:59.75Z"})"},
    {"date far off", Date{1e300}, R"({"@date": 1e+300})"},
    {"date of minus zero", Date{-0.0}, R"({"@date": -0.0})"},
    {"data", Bytes{0, 255}, R"({"@data": "AP8="})"},
    {"no data", Bytes{}, R"({"@data": ""})"},
    {"empty dictionary", Dictionary{}, "{}"},
    {"empty array", Array{}, "[]"},
    {"array", Array{1, "a"}, "[\n  1,\n  \"a\"\n]"},
    {"dictionary", Dictionary{{"b", 1}, {"a", Array{true}}},
     "{\n  \"a\": [\n    true\n  ],\n  \"b\": 1\n}"},
    {"dictionary like a date", Dictionary{{"@date", "x"}}, "{\n  \"@@date\": \"x\"\n}"},
    {"dictionary like an escaped one", Dictionary{{"@@", 1}}, "{\n  \"@@@\": 1\n}"},
    {"dictionary of two", Dictionary{{"@date", "x"}, {"a", 1}},
     "{\n  \"@date\": \"x\",\n  \"a\": 1\n}"},
};

TEST(JsonForm, WritesEachKindInItsWayAndReadsItBack) {
  for (const FormCase& c : kForms) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(jsonFormText(c.value), std::string(c.text) + "\n");
    EXPECT_EQ(readJsonForm(c.text).value, c.value);
  }
}

TEST(JsonForm, ReadsOtherWaysOfWriting) {
  EXPECT_EQ(readJsonForm("\xEF\xBB\xBF 1e2 ").value, Value(100.0));
  EXPECT_EQ(readJsonForm(R"({"@date": "2001-01-01T00:00:01.50Z"})").value, Value(Date{1.5}));
  EXPECT_EQ(readJsonForm(R"({"@data": "AP 8="})").value, Value(Bytes{0, 255}));
}

TEST(JsonForm, SaysWhatIsWrongAndWhere) {
  const struct {
    const char* name;
    const char* text;
    const char* error;
  } kCases[] = {
      {"null", "null", "null is no value of a property list"},
      {"null inside", R"({"a": [1, {"b": null}]})",
       "null is no value of a property list (at a[1].b)"},
      {"integer above the range", R"([18446744073709551616])",
       "the integer does not fit into 64 bits (at [0])"},
      {"integer below the range", R"([0, -9223372036854775809])",
       "the integer does not fit into 64 bits (at [1])"},
      {"key twice", R"({"b": {"a": 1, "a": 1}})", "an object has a key twice (at b)"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const propertylist::ReadResult read = readJsonForm(c.text);
    EXPECT_FALSE(read.value);
    EXPECT_EQ(read.error.description(), c.error);
  }
}

TEST(JsonForm, RefusesWhatIsNoJsonAndUnknownForms) {
  const struct {
    const char* name;
    std::string text;
  } kCases[] = {
      {"nothing", ""},
      {"half an array", "[1"},
      {"two values", "1 2"},
      {"real out of range", "1e999"},
      {"no UTF-8", "\"\xFF\""},
      {"unknown key", R"({"@colour": "red"})"},
      {"date with a zone", R"({"@date": "2001-01-01T00:00:00+01:00"})"},
      {"no such day", R"({"@date": "2001-02-29T00:00:00Z"})"},
      {"date as an integer", R"({"@date": 5})"},
      {"no base64", R"({"@data": "A"})"},
      {"finite real", R"({"@real": "1.0"})"},
      {"bits of a number", R"({"@real": "nan:3ff0000000000000"})"},
      {"too deep", std::string(513, '[') + std::string(513, ']')},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const propertylist::ReadResult read = readJsonForm(c.text);
    EXPECT_FALSE(read.value);
    EXPECT_NE(read.error.description(), "");
  }
}

TEST(JsonForm, KeepsEveryDateAndReal) {
  std::mt19937_64 random(20'261'121);
  const auto keeps = [](const Value& value) {
    return readJsonForm(jsonFormText(value)).value == value;
  };
  for (int i = 0; i < 20'000; ++i) {
    const double any = std::bit_cast<double>(random());
    ASSERT_TRUE(keeps(any)) << any;
    if (std::isfinite(any)) {
      ASSERT_TRUE(keeps(Date{any})) << any;
    }
    const double near = std::ldexp(static_cast<double>(static_cast<std::int64_t>(random())), -30);
    ASSERT_TRUE(keeps(Date{near})) << near;
    const double fraction = std::ldexp(static_cast<double>(random()), -84);
    ASSERT_TRUE(keeps(Date{-fraction})) << fraction;
  }
}

TEST(JsonForm, IsToldFromTheOtherForms) {
  EXPECT_TRUE(looksLikeJson(" {\"a\": 1}"));
  EXPECT_TRUE(looksLikeJson("\xEF\xBB\xBF[]"));
  EXPECT_TRUE(looksLikeJson("-1"));
  EXPECT_TRUE(looksLikeJson("true"));
  EXPECT_FALSE(looksLikeJson("bplist00"));
  EXPECT_FALSE(looksLikeJson(" <?xml version"));
  EXPECT_FALSE(looksLikeJson("\xFF\xFE<"));
  EXPECT_FALSE(looksLikeJson(""));
  EXPECT_FALSE(looksLikeJson(" \n"));
}

}  // namespace
}  // namespace tools
