#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

// UTF-8 as property lists have it: shortest forms only, no surrogates, nothing above U+10FFFF.
namespace propertylist {

// The code point that begins at `position`, which is moved behind it. Empty when there is none,
// with `position` at the first byte that is wrong. `position` is less than the size of `text`.
inline std::optional<char32_t> decodeUTF8(std::string_view text, std::size_t& position);

// Where the ASCII that begins at `from` ends; `from` is within `text`.
std::size_t asciiPrefix(std::string_view text, std::size_t from);

// The last place up to `at` where `text` can be cut without splitting a character. In bytes that
// are not UTF-8 it is `at` itself or at most three bytes before. `at` is within `text`.
std::size_t characterBoundary(std::string_view text, std::size_t at);

// Half of a pair, as UTF-16 has it for what lies above U+FFFF.
constexpr bool isSurrogate(char32_t unit) { return unit >= 0xD800 && unit <= 0xDFFF; }
inline constexpr char32_t kFirstLowSurrogate = 0xDC00;

inline constexpr std::size_t kLongestUTF8 = 4;
// Writes up to so many bytes and answers the place behind them. `codePoint` is one that UTF-8 can
// hold.
inline char* putUTF8(char* to, char32_t codePoint);
void appendUTF8(std::string& text, char32_t codePoint);

// Whether `codePoint` is a number that UTF-8 can hold.
constexpr bool isScalarValue(char32_t codePoint) {
  return codePoint < 0xD800 || (codePoint > 0xDFFF && codePoint <= 0x10FFFF);
}

inline std::optional<char32_t> decodeUTF8(std::string_view text, std::size_t& position) {
  const auto first = static_cast<unsigned char>(text[position]);
  if (first < 0x80) {
    ++position;
    return first;
  }
  if (first < 0xC2 || first > 0xF4) return std::nullopt;
  // How many bytes follow, and the smallest code point that needs so many.
  const std::size_t following = first < 0xE0 ? 1 : first < 0xF0 ? 2 : 3;
  const char32_t smallest = following == 1 ? 0x80 : following == 2 ? 0x800 : 0x10000;
  if (text.size() - position <= following) return std::nullopt;
  char32_t codePoint = first & (0x3FU >> following);
  for (std::size_t i = 1; i <= following; ++i) {
    const auto byte = static_cast<unsigned char>(text[position + i]);
    if ((byte & 0xC0U) != 0x80U) return std::nullopt;
    codePoint = (codePoint << 6U) | (byte & 0x3FU);
  }
  if (codePoint < smallest || !isScalarValue(codePoint)) return std::nullopt;
  position += following + 1;
  return codePoint;
}

inline char* putUTF8(char* to, char32_t codePoint) {
  const auto byteOf = [](char32_t bits) {
    return static_cast<char>(static_cast<unsigned char>(bits));
  };
  if (codePoint < 0x80) {
    *to++ = byteOf(codePoint);
    return to;
  }
  if (codePoint < 0x800) {
    *to++ = byteOf(0xC0U | (codePoint >> 6U));
  } else {
    if (codePoint < 0x10000) {
      *to++ = byteOf(0xE0U | (codePoint >> 12U));
    } else {
      *to++ = byteOf(0xF0U | (codePoint >> 18U));
      *to++ = byteOf(0x80U | ((codePoint >> 12U) & 0x3FU));
    }
    *to++ = byteOf(0x80U | ((codePoint >> 6U) & 0x3FU));
  }
  *to++ = byteOf(0x80U | (codePoint & 0x3FU));
  return to;
}

}  // namespace propertylist
