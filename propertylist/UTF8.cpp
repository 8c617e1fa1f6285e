#include "propertylist/UTF8.h"

#include <array>
#include <cstdint>
#include <cstring>

namespace propertylist {
namespace {

char byteOf(char32_t bits) { return static_cast<char>(static_cast<unsigned char>(bits)); }

}  // namespace

std::optional<char32_t> decodeUTF8(std::string_view text, std::size_t& position) {
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

std::size_t asciiPrefix(std::string_view text, std::size_t from) {
  constexpr std::uint64_t kHighBits = 0x8080808080808080;
  std::size_t at = from;
  for (std::uint64_t word = 0; text.size() - at >= sizeof word; at += sizeof word) {
    std::memcpy(&word, text.data() + at, sizeof word);
    if ((word & kHighBits) != 0) break;
  }
  while (at < text.size() && static_cast<unsigned char>(text[at]) < 0x80) ++at;
  return at;
}

bool isASCII(std::string_view text) { return asciiPrefix(text, 0) == text.size(); }

std::optional<std::size_t> findInvalidUTF8(std::string_view text) {
  for (std::size_t position = 0; position < text.size();) {
    position = asciiPrefix(text, position);
    if (position < text.size() && !decodeUTF8(text, position)) return position;
  }
  return std::nullopt;
}

std::size_t characterBoundary(std::string_view text, std::size_t at) {
  constexpr std::size_t kMostFollowing = 3;
  const auto isFollowing = [text](std::size_t position) {
    return position < text.size() && (static_cast<unsigned char>(text[position]) & 0xC0U) == 0x80U;
  };
  std::size_t boundary = at;
  while (boundary > 0 && at - boundary < kMostFollowing && isFollowing(boundary)) --boundary;
  return isFollowing(boundary) ? at : boundary;
}

char* putUTF8(char* to, char32_t codePoint) {
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

void appendUTF8(std::string& text, char32_t codePoint) {
  std::array<char, kLongestUTF8> bytes{};
  text.append(bytes.data(), putUTF8(bytes.data(), codePoint));
}

}  // namespace propertylist
