#include "tools/common/TypedProperty.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <optional>

#include "tools/common/ExitCode.h"
#include "tools/common/Text.h"
#include "tools/common/Timestamps.h"

namespace tools {

using propertylist::Value;

namespace {

constexpr std::int64_t kSecondsFrom1970To2001 = 978'307'200;

template <typename Number>
std::optional<Value> numberOf(std::string_view text) {
  Number number = 0;
  const auto parsed = std::from_chars(text.data(), text.data() + text.size(), number);
  if (parsed.ec != std::errc{} || parsed.ptr != text.data() + text.size()) return std::nullopt;
  return Value(number);
}

std::optional<Value> integerOf(std::string_view text) {
  if (auto number = numberOf<std::int64_t>(text)) return number;
  return numberOf<std::uint64_t>(text);
}

std::optional<Value> booleanOf(std::string_view text) {
  if (text == "true" || text == "yes") return Value(true);
  if (text == "false" || text == "no") return Value(false);
  return std::nullopt;
}

std::optional<Value> dateOf(std::string_view text) {
  const std::optional<std::int64_t> seconds = secondsOfISODate(text);
  if (!seconds) return std::nullopt;
  return Value(propertylist::Date{static_cast<double>(*seconds - kSecondsFrom1970To2001)});
}

std::optional<Value> dataOf(std::string_view text) {
  if (text.size() % 2 != 0) return std::nullopt;
  propertylist::Bytes bytes;
  for (std::size_t i = 0; i < text.size(); i += 2) {
    std::uint8_t byte = 0;
    const auto parsed = std::from_chars(text.data() + i, text.data() + i + 2, byte, 16);
    if (parsed.ec != std::errc{} || parsed.ptr != text.data() + i + 2) return std::nullopt;
    bytes.push_back(byte);
  }
  return Value(bytes);
}

std::optional<Value> valueOf(std::string_view kind, std::string_view text) {
  if (kind == "integer") return integerOf(text);
  if (kind == "real") return numberOf<double>(text);
  if (kind == "boolean") return booleanOf(text);
  if (kind == "date") return dateOf(text);
  if (kind == "data") return dataOf(text);
  if (kind == "string" && isText(text)) return Value(text);
  return std::nullopt;
}

std::string_view exampleOf(std::string_view kind) {
  if (kind == "integer") return "a whole number of at most 64 bits";
  if (kind == "real") return "a number such as 0.5";
  if (kind == "boolean") return "true or false";
  if (kind == "date") return "a date such as 2026-11-21T02:40:00Z";
  if (kind == "data") return "hexadecimal digits, two for each byte";
  return "UTF-8 text";
}

}  // namespace

Value typedValue(std::string_view kind, std::string_view text, std::string_view shown) {
  constexpr std::array kKinds = {"string", "integer", "real", "boolean", "date", "data"};
  if (std::find(kKinds.begin(), kKinds.end(), kind) == kKinds.end())
    throw CommandFailure(ExitCode::wrongUsage,
                         fmt::format("\"{}\": there is no kind \"{}\"; what follows the last "
                                     "\":\" of the key is one of {}",
                                     shown, kind, fmt::join(kKinds, ", ")));
  std::optional<Value> value = valueOf(kind, text);
  if (!value)
    throw CommandFailure(ExitCode::wrongUsage, fmt::format("\"{}\": the value is no {}; write {}",
                                                           shown, kind, exampleOf(kind)));
  return *std::move(value);
}

TypedKey typedKey(std::string_view text) {
  const std::size_t colon = text.rfind(':');
  if (colon == std::string_view::npos || colon == 0) return {std::string(text), "string"};
  return {std::string(text.substr(0, colon)), std::string(text.substr(colon + 1))};
}

std::pair<std::string, Value> typedProperty(const std::string& text) {
  const std::size_t equals = text.find('=');
  auto [key, kind] = typedKey(std::string_view(text).substr(0, equals));
  if (equals == std::string::npos || key.empty() || !isText(key))
    throw CommandFailure(ExitCode::wrongUsage,
                         fmt::format("\"{}\" is no property; write KEY=VALUE", text));
  return {std::move(key), typedValue(kind, std::string_view(text).substr(equals + 1), text)};
}

}  // namespace tools
