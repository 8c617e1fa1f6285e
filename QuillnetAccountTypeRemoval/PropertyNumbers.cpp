#include "QuillnetAccountTypeRemoval/PropertyNumbers.h"

#include <cmath>
#include <limits>
#include <optional>
#include <string>
#include <string_view>

namespace accountsettings {
namespace {

constexpr std::string_view kBlanks = " \t\n\v\f\r";

std::string_view withoutLeadingBlanks(std::string_view text) {
  const std::size_t start = text.find_first_not_of(kBlanks);
  return start == std::string_view::npos ? std::string_view() : text.substr(start);
}

std::int64_t integerOfString(std::string_view text) {
  text = withoutLeadingBlanks(text);
  const bool negative = text.starts_with('-');
  if (negative || text.starts_with('+')) text.remove_prefix(1);
  constexpr std::int64_t kMinimum = std::numeric_limits<std::int64_t>::min();
  std::int64_t number = 0;  // kept negative, so that the smallest number fits
  for (const char c : text) {
    if (c < '0' || c > '9') break;
    const int digit = c - '0';
    if (number < (kMinimum + digit) / 10) {
      number = kMinimum;
      break;
    }
    number = number * 10 - digit;
  }
  if (negative) return number;
  return number == kMinimum ? std::numeric_limits<std::int64_t>::max() : -number;
}

std::int64_t integerOfReal(double real) {
  constexpr double kLimit = 9223372036854775808.0;  // 2^63
  if (std::isnan(real)) return 0;
  if (real >= kLimit) return std::numeric_limits<std::int64_t>::max();
  if (real < -kLimit) return std::numeric_limits<std::int64_t>::min();
  return static_cast<std::int64_t>(real);
}

bool booleanOfString(std::string_view text) {
  text = withoutLeadingBlanks(text);
  if (text.starts_with('-') || text.starts_with('+')) text.remove_prefix(1);
  const std::size_t start = text.find_first_not_of('0');
  if (start == std::string_view::npos) return false;
  return std::string_view("YyTt123456789").find(text[start]) != std::string_view::npos;
}

}  // namespace

std::int64_t integerValue(const propertylist::Value* value) {
  if (value == nullptr) return 0;
  if (const auto integer = value->asInteger()) return *integer;
  if (value->asUnsigned()) return std::numeric_limits<std::int64_t>::max();
  if (const auto boolean = value->asBoolean()) return *boolean ? 1 : 0;
  if (const auto real = value->asReal()) return integerOfReal(*real);
  if (const propertylist::Text* string = value->asString()) return integerOfString(*string);
  return 0;
}

bool booleanValue(const propertylist::Value* value) {
  if (value == nullptr) return false;
  if (const auto boolean = value->asBoolean()) return *boolean;
  if (const auto real = value->asReal()) return *real != 0.0;
  if (const propertylist::Text* string = value->asString()) return booleanOfString(*string);
  return integerValue(value) != 0;
}

}  // namespace accountsettings
