#include "tools/common/Timestamps.h"

#include <array>
#include <chrono>

#include "tools/device-image/import/TextLines.h"

namespace tools {
namespace {

// Takes the parts of a date from the front of a text.
class Taker {
 public:
  explicit Taker(std::string_view text) : _text(text) {}

  // A number of at least `minimum` and at most `maximum` digits.
  std::optional<int> number(std::size_t minimum, std::size_t maximum) {
    int value = 0;
    std::size_t count = 0;
    for (; count < maximum && count < _text.size() && isDigit(_text[count]); ++count)
      value = value * 10 + (_text[count] - '0');
    if (count < minimum) return std::nullopt;
    _text.remove_prefix(count);
    return value;
  }
  bool skip(char c) {
    if (_text.empty() || _text.front() != c) return false;
    _text.remove_prefix(1);
    return true;
  }
  void skipBlanks() {
    while (skip(' ') || skip('\t')) {
    }
  }
  void skipDigits() {
    while (!_text.empty() && isDigit(_text.front())) _text.remove_prefix(1);
  }
  std::string_view word() {
    std::size_t count = 0;
    while (count < _text.size() && ((_text[count] >= 'a' && _text[count] <= 'z') ||
                                    (_text[count] >= 'A' && _text[count] <= 'Z')))
      ++count;
    const std::string_view taken = _text.substr(0, count);
    _text.remove_prefix(count);
    return taken;
  }
  bool atEnd() const { return _text.empty(); }

 private:
  static bool isDigit(char c) { return c >= '0' && c <= '9'; }
  std::string_view _text;
};

std::optional<std::int64_t> secondsOfDay(int year, int month, int day) {
  const std::chrono::year_month_day date{std::chrono::year(year),
                                         std::chrono::month(static_cast<unsigned>(month)),
                                         std::chrono::day(static_cast<unsigned>(day))};
  if (!date.ok()) return std::nullopt;
  return std::chrono::seconds(std::chrono::sys_days(date).time_since_epoch()).count();
}

// "02:40:00" or "024000", the seconds optional.
std::optional<std::int64_t> takeTime(Taker& taker) {
  const std::optional<int> hours = taker.number(2, 2);
  taker.skip(':');
  const std::optional<int> minutes = taker.number(2, 2);
  taker.skip(':');
  const int seconds = taker.number(2, 2).value_or(0);
  if (!hours || !minutes || *hours > 24 || *minutes > 59 || seconds > 60) return std::nullopt;
  if (taker.skip('.') || taker.skip(',')) taker.skipDigits();
  return *hours * 3600 + *minutes * 60 + seconds;
}

// "Z", "+0100", "-05:30" or a name of UTC; the seconds to take away. Nothing at all counts as UTC.
std::optional<std::int64_t> takeZone(Taker& taker) {
  const bool minus = taker.skip('-');
  if (!minus && !taker.skip('+')) {
    const std::string_view name = taker.word();
    if (name.empty() || name == "Z" || name == "UT" || name == "UTC" || name == "GMT") return 0;
    return std::nullopt;
  }
  const std::optional<int> hours = taker.number(2, 2);
  taker.skip(':');
  const int minutes = taker.number(2, 2).value_or(0);
  if (!hours || *hours > 23 || minutes > 59) return std::nullopt;
  const std::int64_t offset = *hours * 3600 + minutes * 60;
  return minus ? -offset : offset;
}

std::optional<int> monthOfName(std::string_view name) {
  constexpr std::array<std::string_view, 12> kMonths = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                                        "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
  for (std::size_t i = 0; i < kMonths.size(); ++i)
    if (equalsIgnoringCase(name, kMonths[i])) return static_cast<int>(i) + 1;
  return std::nullopt;
}

std::optional<std::int64_t> takeTimeAndZone(Taker& taker, std::int64_t day) {
  const std::optional<std::int64_t> time = takeTime(taker);
  taker.skipBlanks();
  const std::optional<std::int64_t> offset = takeZone(taker);
  if (!time || !offset) return std::nullopt;
  return day + *time - *offset;
}

}  // namespace

std::optional<std::int64_t> secondsOfISODate(std::string_view text) {
  Taker taker(trimmed(text));
  const std::optional<int> year = taker.number(4, 4);
  taker.skip('-');
  const std::optional<int> month = taker.number(2, 2);
  taker.skip('-');
  const std::optional<int> day = taker.number(2, 2);
  if (!year || !month || !day) return std::nullopt;
  std::optional<std::int64_t> seconds = secondsOfDay(*year, *month, *day);
  if (!seconds || taker.atEnd()) return seconds;
  if (!taker.skip('T') && !taker.skip('t') && !taker.skip(' ')) return std::nullopt;
  seconds = takeTimeAndZone(taker, *seconds);
  return taker.atEnd() ? seconds : std::nullopt;
}

std::optional<std::int64_t> secondsOfMessageDate(std::string_view text) {
  Taker taker(trimmed(text));
  if (!taker.word().empty()) {
    taker.skip(',');
    taker.skipBlanks();
  }
  const std::optional<int> day = taker.number(1, 2);
  taker.skipBlanks();
  const std::optional<int> month = monthOfName(taker.word());
  taker.skipBlanks();
  const std::optional<int> year = taker.number(4, 4);
  taker.skipBlanks();
  if (!day || !month || !year) return std::nullopt;
  const std::optional<std::int64_t> seconds = secondsOfDay(*year, *month, *day);
  if (!seconds) return std::nullopt;
  return takeTimeAndZone(taker, *seconds);  // a comment may follow the zone
}

}  // namespace tools
