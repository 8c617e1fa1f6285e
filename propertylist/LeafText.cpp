#include "propertylist/LeafText.h"

#include <array>
#include <charconv>
#include <limits>

namespace propertylist {
namespace {

constexpr std::string_view kBlanks = " \t\r\n";
constexpr std::string_view kAlphabet =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

constexpr std::uint8_t kNoDigit = 0xFF;
// The worth of each character as a digit.
constexpr std::array<std::uint8_t, 256> kDigits = [] {
  std::array<std::uint8_t, 256> digits{};
  for (std::uint8_t& digit : digits) digit = kNoDigit;
  for (std::size_t i = 0; i < kAlphabet.size(); ++i)
    digits[static_cast<unsigned char>(kAlphabet[i])] = static_cast<std::uint8_t>(i);
  return digits;
}();

// Takes a sign off the front of `text`; true for a minus.
bool takeSign(std::string_view& text) {
  const bool isNegative = text.starts_with('-');
  if (isNegative || text.starts_with('+')) text.remove_prefix(1);
  return isNegative;
}

// Decodes the groups of four digits that begin at `at`, which most of a text are; the place behind
// them.
std::size_t takeGroups(std::string_view text, std::size_t at, Bytes& data) {
  for (; text.size() - at >= 4; at += 4) {
    std::uint32_t bits = 0;
    std::uint8_t all = 0;
    for (const char c : text.substr(at, 4)) {
      const std::uint8_t digit = kDigits[static_cast<unsigned char>(c)];
      all |= digit;
      bits = bits << 6U | digit;
    }
    if (all == kNoDigit) break;
    for (const unsigned shift : {16U, 8U, 0U})
      data.push_back(static_cast<std::uint8_t>(bits >> shift));
  }
  return at;
}

bool equalsIgnoringCase(std::string_view text, std::string_view lowerCase) {
  if (text.size() != lowerCase.size()) return false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if ((text[i] | 0x20) != lowerCase[i]) return false;
  }
  return true;
}

}  // namespace

std::string_view withoutBlanks(std::string_view text) {
  const std::size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

std::optional<IntegerText> parseIntegerText(std::string_view text) {
  text = withoutBlanks(text);
  const bool isNegative = takeSign(text);
  const bool isHexadecimal = text.starts_with("0x") || text.starts_with("0X");
  if (isHexadecimal) text.remove_prefix(2);
  std::uint64_t magnitude = 0;
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, magnitude, isHexadecimal ? 16 : 10);
  if (error != std::errc() || stop != end) return std::nullopt;
  if (!isNegative || magnitude == 0) return IntegerText{magnitude, false};
  if (magnitude > std::uint64_t{1} << 63U) return std::nullopt;
  return IntegerText{0 - magnitude, true};
}

std::optional<double> parseRealText(std::string_view text) {
  text = withoutBlanks(text);
  const bool isNegative = takeSign(text);
  double magnitude = 0;
  if (equalsIgnoringCase(text, "nan") && !isNegative) {
    return std::numeric_limits<double>::quiet_NaN();
  }
  if (equalsIgnoringCase(text, "inf") || equalsIgnoringCase(text, "infinity")) {
    magnitude = std::numeric_limits<double>::infinity();
  } else {
    // What from_chars takes besides: words and another sign.
    if (text.empty() || text.find_first_not_of("0123456789.eE+-") != std::string_view::npos ||
        text.starts_with('-')) {
      return std::nullopt;
    }
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, magnitude);
    if (error != std::errc() || stop != end) return std::nullopt;
  }
  return isNegative ? -magnitude : magnitude;
}

std::string integerText(const Value& integer) {
  const std::optional<std::int64_t> asSigned = integer.asInteger();
  return asSigned ? std::to_string(*asSigned) : std::to_string(*integer.asUnsigned());
}

std::string realText(double real) {
  std::array<char, 32> text{};
  const auto [end, error] = std::to_chars(text.data(), text.data() + text.size(), real);
  return {text.data(), end};
}

std::optional<Bytes> parseBase64(std::string_view text) {
  Bytes data;
  std::uint32_t bits = 0;
  std::size_t digits = 0;
  std::size_t padding = 0;
  data.reserve(text.size() / 4 * 3);
  for (std::size_t at = 0; at < text.size(); ++at) {
    if (digits % 4 == 0 && padding == 0) at = takeGroups(text, at, data);
    if (at == text.size()) break;
    const char c = text[at];
    if (c == ' ' || c == '\t' || c == '\r' || c == '\n') continue;
    const std::uint8_t digit = c == '=' ? std::uint8_t{0} : kDigits[static_cast<unsigned char>(c)];
    if (digit == kNoDigit || (padding > 0 && c != '=')) return std::nullopt;
    if (c == '=') ++padding;
    bits = bits << 6U | digit;
    if (++digits % 4 != 0) continue;
    if (padding > 2) return std::nullopt;
    for (std::size_t i = 0; i < 3 - padding; ++i) {
      data.push_back(static_cast<std::uint8_t>(bits >> (16 - 8 * i)));
    }
    bits = 0;
    if (padding > 0) padding = 3;  // nothing may follow, padding neither
  }
  if (digits % 4 != 0) return std::nullopt;
  return data;
}

std::string base64Text(const Bytes& data) {
  std::string text;
  text.reserve((data.size() + 2) / 3 * 4);
  for (std::size_t i = 0; i < data.size(); i += 3) {
    const std::size_t count = std::min(data.size() - i, std::size_t{3});
    std::uint32_t bits = 0;
    for (std::size_t j = 0; j < 3; ++j) bits = bits << 8U | (j < count ? data[i + j] : 0U);
    for (std::size_t j = 0; j < 4; ++j) {
      text += j <= count ? kAlphabet[bits >> (18 - 6 * j) & 0x3FU] : '=';
    }
  }
  return text;
}

}  // namespace propertylist
