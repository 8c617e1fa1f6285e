#include "platform/LogFormat.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <memory>

namespace platform {
namespace {

struct Account : Describable {
  std::string description() const override {
    ++described;
    return "<Account: 100 %@>";
  }
  mutable int described = 0;
};

TEST(LogFormat, PrintsEachKindOfArgument) {
  const propertylist::Dictionary dictionary = {{"b", propertylist::Array{1, "two"}}, {"a", true}};
  const propertylist::Value value = dictionary;
  const std::optional<Error> error = Error{"the disk is full"};
  const Account account;
  const struct {
    const char* name;
    LogArgument argument;
    const char* printed;
  } kCases[] = {
      {"literal", "text", "text"},
      {"view", std::string_view("text"), "text"},
      {"value", value, "{a = 1; b = (1, two)}"},
      {"pointer to a value", &value, "{a = 1; b = (1, two)}"},
      {"dictionary", dictionary, "{a = 1; b = (1, two)}"},
      {"error", error, "the disk is full"},
      {"object", account, "<Account: 100 %@>"},
      {"pointer to an object", &account, "<Account: 100 %@>"},
      {"number", -7, "-7"},
      {"unsigned number", std::numeric_limits<unsigned long>::max(), "18446744073709551615"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(formatLogLine("[%@]", {c.argument}), std::string("[") + c.printed + "]");
    EXPECT_EQ(formatLogLine("[%s]", {c.argument}), std::string("[") + c.printed + "]");
  }
}

TEST(LogFormat, PrintsNullForWhatIsNotThere) {
  const std::optional<std::string> noText;
  const std::optional<Error> noError;
  const std::optional<propertylist::Dictionary> noDictionary;
  const std::optional<propertylist::Array> noArray;
  const propertylist::Value* noValue = nullptr;
  const Describable* noObject = nullptr;
  const std::shared_ptr<Account> noAccount;
  const char* noCharacters = nullptr;
  for (const LogArgument& argument :
       {LogArgument(noText), LogArgument(noError), LogArgument(noDictionary), LogArgument(noArray),
        LogArgument(noValue), LogArgument(noObject), LogArgument(noAccount),
        LogArgument(noCharacters)}) {
    EXPECT_EQ(formatLogLine("%@", {argument}), "(null)");
    EXPECT_EQ(formatLogLine("%s", {argument}), "(null)");
  }
}

TEST(LogFormat, PrintsASharedObject) {
  const auto account = std::make_shared<Account>();
  EXPECT_EQ(formatLogLine("Checking %@", {account}), "Checking <Account: 100 %@>");
}

TEST(LogFormat, PrintsWhatOptionalsHold) {
  const std::optional<std::string> text = "text";
  const std::optional<propertylist::Dictionary> dictionary = propertylist::Dictionary{{"a", 1}};
  const std::optional<propertylist::Array> array = propertylist::Array{1, 2};
  EXPECT_EQ(formatLogLine("%@ %@ %@", {text, dictionary, array}), "text {a = 1} (1, 2)");
}

TEST(LogFormat, PrintsNumbersAsTheirConversionSays) {
  const std::int64_t large = 0x1'0000'0002;
  EXPECT_EQ(formatLogLine("%d", {-5}), "-5");
  EXPECT_EQ(formatLogLine("%d", {large}), "2");
  EXPECT_EQ(formatLogLine("%d", {0x80000000L}), "-2147483648");
  EXPECT_EQ(formatLogLine("%ld", {large}), "4294967298");
  EXPECT_EQ(formatLogLine("%ld", {std::numeric_limits<std::int64_t>::min()}),
            "-9223372036854775808");
  EXPECT_EQ(formatLogLine("%d %ld", {"seven", "seven"}), "0 0");
}

TEST(LogFormat, ReplacesNothingButConversions) {
  EXPECT_EQ(formatLogLine("", {}), "");
  EXPECT_EQ(formatLogLine("plain", {}), "plain");
  EXPECT_EQ(formatLogLine("100%% %@%%", {"x"}), "100% x%");
  EXPECT_EQ(formatLogLine("%", {"x"}), "%");
  EXPECT_EQ(formatLogLine("%l %x %@", {"x"}), "%l %x x");
  EXPECT_EQ(formatLogLine("%l", {1}), "%l");
  EXPECT_EQ(formatLogLine("%%@", {"x"}), "%@");
}

TEST(LogFormat, IgnoresArgumentsThatAreLeftOver) {
  EXPECT_EQ(formatLogLine("Inserting account:", {"x", 1}), "Inserting account:");
  EXPECT_EQ(formatLogLine("%@:%@", {"a", "b", "c"}), "a:b");
}

TEST(LogFormat, PrintsNullForAMissingArgument) {
  EXPECT_EQ(formatLogLine("%@ %s %d %ld", {"a"}), "a (null) (null) (null)");
}

TEST(LogFormat, NeverInterpretsAnArgument) {
  EXPECT_EQ(formatLogLine("%@ and %@", {"%@ %s %n %d %%", "b"}), "%@ %s %n %d %% and b");
}

TEST(LogFormat, DescribesAnObjectOnlyWhenALineIsMade) {
  const Account account;
  const LogArgument argument = account;
  EXPECT_EQ(account.described, 0);
  EXPECT_EQ(formatLogLine("left over", {argument}), "left over");
  EXPECT_EQ(account.described, 0);
  EXPECT_EQ(formatLogLine("%@", {argument}), "<Account: 100 %@>");
  EXPECT_EQ(account.described, 1);
}

TEST(LogFormat, CutsAnArgumentBehindItsLimitAtTheEndOfACharacter) {
  const Account account;
  const propertylist::Dictionary dictionary{{"a", "b"}};
  const struct {
    const char* name;
    LogArgument argument;
    std::size_t limit;
    const char* printed;
  } kCases[] = {
      {"as long as the limit", "text", 4, "text"},
      {"one byte more", "text", 3, "tex..."},
      {"nothing fits", "text", 0, "..."},
      {"before a character of two bytes", "ab\u00e9", 3, "ab..."},
      {"behind a character of two bytes", "a\u00e9b", 3, "a\u00e9..."},
      {"before a character of four bytes", "a\U0001F600", 4, "a..."},
      {"value", dictionary, 4, "{a =..."},
      {"object", account, 8, "<Account..."},
      {"number", -1234, 3, "-1234"},
      {"nothing", LogArgument(static_cast<const char*>(nullptr)), 3, "(null)"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(formatLogLine("[%@]", {c.argument}, c.limit), std::string("[") + c.printed + "]");
  }
}

TEST(LogFormat, CutsNothingWithoutALimit) {
  const std::string text(1'000'000, 'x');
  EXPECT_TRUE(formatLogLine("%@", {text}) == text);
}

TEST(LogFormat, KeepsBytesThatAreNoText) {
  const std::string bytes("a\0\xFF", 3);
  EXPECT_EQ(formatLogLine("%@", {bytes}), bytes);
}

}  // namespace
}  // namespace platform
