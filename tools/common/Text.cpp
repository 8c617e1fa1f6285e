#include "tools/common/Text.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdint>

namespace tools {
namespace {

char upperCased(char letter) {
  return letter >= 'a' && letter <= 'z' ? static_cast<char>(letter - 'a' + 'A') : letter;
}

// The length of the UTF-8 sequence at the front of `bytes`, which is not empty; 0 when it is none.
std::size_t sequenceLength(std::string_view bytes) {
  const auto byteAt = [&](std::size_t i) { return static_cast<std::uint8_t>(bytes[i]); };
  const std::uint8_t first = byteAt(0);
  if (first < 0x80) return first == 0 ? 0 : 1;
  const std::size_t length = first >= 0xF0 ? 4 : first >= 0xE0 ? 3 : 2;
  if (first < 0xC2 || first > 0xF4 || bytes.size() < length) return 0;
  // The second byte's range leaves out overlong forms, surrogates and what lies above U+10FFFF.
  const std::uint8_t low = first == 0xE0 ? 0xA0 : first == 0xF0 ? 0x90 : 0x80;
  const std::uint8_t high = first == 0xED ? 0x9F : first == 0xF4 ? 0x8F : 0xBF;
  if (byteAt(1) < low || byteAt(1) > high) return 0;
  for (std::size_t i = 2; i < length; ++i)
    if ((byteAt(i) & 0xC0U) != 0x80) return 0;
  return length;
}

// One UTF-8 sequence, or a byte that is none.
std::string shownCharacter(std::string_view bytes) {
  const auto first = static_cast<std::uint8_t>(bytes[0]);
  if (bytes.size() == 1)
    return first >= 0x20 && first < 0x7F ? std::string(bytes) : fmt::format("\\x{:02x}", first);
  const bool isControl = first == 0xC2 && static_cast<std::uint8_t>(bytes[1]) < 0xA0;
  const bool turnsDirection =
      (bytes >= "\u202A" && bytes <= "\u202E") || (bytes >= "\u2066" && bytes <= "\u2069");
  if (isControl) return fmt::format("\\u{:04x}", static_cast<std::uint8_t>(bytes[1]));
  if (!turnsDirection) return std::string(bytes);
  const unsigned low = (static_cast<std::uint8_t>(bytes[1]) & 0x3FU) << 6U;
  return fmt::format("\\u{:04x}", 0x2000U | low | (static_cast<std::uint8_t>(bytes[2]) & 0x3FU));
}

}  // namespace

bool isText(std::string_view bytes) {
  while (!bytes.empty()) {
    const std::size_t length = sequenceLength(bytes);
    if (length == 0) return false;
    bytes.remove_prefix(length);
  }
  return true;
}

std::string forTerminal(std::string_view text) {
  std::string shown;
  while (!text.empty()) {
    const std::size_t length = std::max<std::size_t>(sequenceLength(text), 1);
    shown += shownCharacter(text.substr(0, length));
    text.remove_prefix(length);
  }
  return shown;
}

std::string_view trimmed(std::string_view text) {
  constexpr std::string_view kBlank = " \t\r\n";
  const std::size_t first = text.find_first_not_of(kBlank);
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(kBlank) - first + 1);
}

std::string upperCased(std::string_view text) {
  std::string result(text);
  for (char& letter : result) letter = upperCased(letter);
  return result;
}

bool equalsIgnoringCase(std::string_view a, std::string_view b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char x, char y) { return upperCased(x) == upperCased(y); });
}

}  // namespace tools
