#include "tools/account-settings/ExactDates.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <chrono>
#include <cmath>
#include <cstdint>
#include <system_error>

namespace tools {
namespace {

using propertylist::Date;

constexpr std::chrono::sys_days kEpoch = std::chrono::year(2001) / 1 / 1;
constexpr std::int64_t kSecondsADay = 86'400;
// "2001-01-01T00:00:00", what stands before the fraction.
constexpr std::size_t kWholeSize = 19;

// A decimal number, parted into the next lower whole number and the digits of what is above it. The
// parting works on digits, since a double cannot hold every such fraction.
struct Decimal {
  std::int64_t whole = 0;
  std::string fraction;
};

// The fraction of the number that lies as far from the next whole number on the other side: of 0.25
// it is 0.75. `digits` do not end in "0".
std::string complement(std::string digits) {
  for (char& digit : digits) digit = static_cast<char>('0' + '9' - digit);
  if (!digits.empty()) ++digits.back();
  return digits;
}

// The shortest decimal number that is read back as `number`, which is below 1e15.
Decimal decimalOf(double number) {
  std::array<char, 400> text{};
  const auto written = std::to_chars(text.data(), text.data() + text.size(), std::abs(number),
                                     std::chars_format::fixed);
  const std::string_view digits(text.data(), static_cast<std::size_t>(written.ptr - text.data()));
  const std::size_t point = std::min(digits.find('.'), digits.size());
  Decimal decimal;
  std::from_chars(digits.data(), digits.data() + point, decimal.whole);
  decimal.fraction = digits.substr(std::min(point + 1, digits.size()));
  if (number >= 0) return decimal;
  decimal.whole = -decimal.whole - (decimal.fraction.empty() ? 0 : 1);
  decimal.fraction = complement(std::move(decimal.fraction));
  return decimal;
}

std::optional<double> numberOf(Decimal decimal) {
  decimal.fraction.erase(decimal.fraction.find_last_not_of('0') + 1);
  const bool isNegative = decimal.whole < 0;
  if (isNegative && !decimal.fraction.empty()) {
    ++decimal.whole;
    decimal.fraction = complement(std::move(decimal.fraction));
  }
  const std::string text = fmt::format("{}.{}", std::abs(decimal.whole), decimal.fraction);
  double number = 0;
  const auto read =
      std::from_chars(text.data(), text.data() + text.size(), number, std::chars_format::fixed);
  if (read.ec != std::errc{}) return std::nullopt;
  return isNegative ? -number : number;
}

std::optional<std::int64_t> digitsAt(std::string_view text, std::size_t position,
                                     std::size_t count) {
  std::int64_t number = 0;
  for (const char digit : text.substr(position, count)) {
    if (digit < '0' || digit > '9') return std::nullopt;
    number = number * 10 + (digit - '0');
  }
  return number;
}

// The seconds since 2001 of a text of exactly "YYYY-MM-DDThh:mm:ss".
std::optional<std::int64_t> wholeSecondsOf(std::string_view text) {
  constexpr std::string_view kForm = "0000-00-00T00:00:00";
  for (std::size_t i = 0; i < kWholeSize; ++i)
    if (kForm[i] != '0' && kForm[i] != text[i]) return std::nullopt;
  const auto year = digitsAt(text, 0, 4);
  const auto month = digitsAt(text, 5, 2);
  const auto day = digitsAt(text, 8, 2);
  const auto hour = digitsAt(text, 11, 2);
  const auto minute = digitsAt(text, 14, 2);
  const auto second = digitsAt(text, 17, 2);
  if (!year || !month || !day || !hour || !minute || !second) return std::nullopt;
  const std::chrono::year_month_day date{std::chrono::year(static_cast<int>(*year)),
                                         std::chrono::month(static_cast<unsigned>(*month)),
                                         std::chrono::day(static_cast<unsigned>(*day))};
  if (!date.ok() || *year == 0 || *hour > 23 || *minute > 59 || *second > 59) return std::nullopt;
  const std::int64_t days = (std::chrono::sys_days(date) - kEpoch).count();
  return days * kSecondsADay + *hour * 3600 + *minute * 60 + *second;
}

}  // namespace

std::optional<std::string> exactDateText(Date date) {
  constexpr double kFarthest = 400.0 * 366 * kSecondsADay * 25;  // ten thousand years
  if (!(std::abs(date.secondsSince2001) < kFarthest)) return std::nullopt;
  const Decimal seconds = decimalOf(date.secondsSince2001);
  const std::int64_t ofDay = (seconds.whole % kSecondsADay + kSecondsADay) % kSecondsADay;
  const std::chrono::year_month_day day(kEpoch +
                                        std::chrono::days((seconds.whole - ofDay) / kSecondsADay));
  std::string text = fmt::format("{:04}-{:02}-{:02}T{:02}:{:02}:{:02}{}{}Z",
                                 static_cast<int>(day.year()), static_cast<unsigned>(day.month()),
                                 static_cast<unsigned>(day.day()), ofDay / 3600, ofDay / 60 % 60,
                                 ofDay % 60, seconds.fraction.empty() ? "" : ".", seconds.fraction);
  // Also refuses the years that four digits cannot hold.
  if (parseExactDateText(text) != date) return std::nullopt;
  return text;
}

std::optional<Date> parseExactDateText(std::string_view text) {
  if (text.size() <= kWholeSize || !text.ends_with('Z')) return std::nullopt;
  const auto whole = wholeSecondsOf(text);
  std::string_view fraction = text.substr(kWholeSize);
  fraction.remove_suffix(1);
  if (!whole || fraction == ".") return std::nullopt;
  if (!fraction.empty() && fraction.front() != '.') return std::nullopt;
  if (!fraction.empty()) fraction.remove_prefix(1);
  if (fraction.find_first_not_of("0123456789") != std::string_view::npos) return std::nullopt;
  const auto seconds = numberOf({*whole, std::string(fraction)});
  if (!seconds) return std::nullopt;
  return Date{*seconds};
}

}  // namespace tools
