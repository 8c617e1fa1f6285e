#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

// UTF-8 as property lists have it: shortest forms only, no surrogates, nothing above U+10FFFF.
namespace propertylist {

// The code point that begins at `position`, which is moved behind it. Empty when there is none,
// with `position` at the first byte that is wrong. `position` is less than the size of `text`.
std::optional<char32_t> decodeUTF8(std::string_view text, std::size_t& position);

// Where the ASCII that begins at `from` ends; `from` is within `text`.
std::size_t asciiPrefix(std::string_view text, std::size_t from);
bool isASCII(std::string_view text);

// Where `text` stops being UTF-8; empty when it never does.
std::optional<std::size_t> findInvalidUTF8(std::string_view text);

// The last place up to `at` where `text` can be cut without splitting a character. In bytes that
// are not UTF-8 it is `at` itself or at most three bytes before. `at` is within `text`.
std::size_t characterBoundary(std::string_view text, std::size_t at);

inline constexpr std::size_t kLongestUTF8 = 4;
// Writes up to so many bytes and answers the place behind them. `codePoint` is one that UTF-8 can
// hold.
char* putUTF8(char* to, char32_t codePoint);
void appendUTF8(std::string& text, char32_t codePoint);

// Whether `codePoint` is a number that UTF-8 can hold.
constexpr bool isScalarValue(char32_t codePoint) {
  return codePoint < 0xD800 || (codePoint > 0xDFFF && codePoint <= 0x10FFFF);
}

}  // namespace propertylist
