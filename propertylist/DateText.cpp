#include "propertylist/DateText.h"

#include <array>
#include <chrono>
#include <cmath>
#include <cstdio>

namespace propertylist {
namespace {

using std::chrono::days;
using std::chrono::sys_days;
using std::chrono::year_month_day;

constexpr sys_days kStart = sys_days(year_month_day(std::chrono::year(2001) / 1 / 1));
constexpr std::int64_t kSecondsOfDay = 86400;

std::int64_t secondsAt(year_month_day day) {
  return (sys_days(day) - kStart).count() * kSecondsOfDay;
}

}  // namespace

std::optional<std::string> dateText(Date date) {
  const auto first = static_cast<double>(secondsAt(std::chrono::year(1) / 1 / 1));
  const auto end = static_cast<double>(secondsAt(std::chrono::year(10000) / 1 / 1));
  const bool isInRange = date.secondsSince2001 >= first && date.secondsSince2001 < end;
  if (!isInRange) return std::nullopt;  // also what is no number
  const auto seconds = static_cast<std::int64_t>(std::floor(date.secondsSince2001));
  const auto sinceMidnight = (seconds % kSecondsOfDay + kSecondsOfDay) % kSecondsOfDay;
  const auto dayNumber = static_cast<int>((seconds - sinceMidnight) / kSecondsOfDay);
  const year_month_day day(kStart + days(dayNumber));
  std::array<char, 32> text{};
  const int length = std::snprintf(
      text.data(), text.size(), "%04d-%02u-%02uT%02d:%02d:%02dZ", static_cast<int>(day.year()),
      static_cast<unsigned>(day.month()), static_cast<unsigned>(day.day()),
      static_cast<int>(sinceMidnight / 3600), static_cast<int>(sinceMidnight / 60 % 60),
      static_cast<int>(sinceMidnight % 60));
  return std::string(text.data(), static_cast<std::size_t>(length));
}

std::optional<Date> parseDateText(std::string_view text) {
  constexpr std::string_view kForm = "dddd-dd-ddTdd:dd:ddZ";
  if (text.size() != kForm.size()) return std::nullopt;
  for (std::size_t i = 0; i < kForm.size(); ++i) {
    const bool isDigit = text[i] >= '0' && text[i] <= '9';
    if (kForm[i] == 'd' ? !isDigit : text[i] != kForm[i]) return std::nullopt;
  }
  const auto number = [&](std::size_t at, std::size_t digits) {
    int result = 0;
    for (const char digit : text.substr(at, digits)) result = result * 10 + (digit - '0');
    return result;
  };
  const year_month_day day(std::chrono::year(number(0, 4)),
                           std::chrono::month(static_cast<unsigned>(number(5, 2))),
                           std::chrono::day(static_cast<unsigned>(number(8, 2))));
  const int hour = number(11, 2);
  const int minute = number(14, 2);
  const int second = number(17, 2);
  const bool exists = day.ok() && number(0, 4) >= 1 && hour < 24 && minute < 60 && second < 60;
  if (!exists) return std::nullopt;
  const std::int64_t seconds =
      secondsAt(day) + std::int64_t{hour} * 3600 + std::int64_t{minute} * 60 + second;
  return Date{static_cast<double>(seconds)};
}

}  // namespace propertylist
