#include "propertylist/UTF8.h"

#include <array>
#include <cstdint>
#include <cstring>

namespace propertylist {

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

std::size_t characterBoundary(std::string_view text, std::size_t at) {
  constexpr std::size_t kMostFollowing = 3;
  const auto isFollowing = [text](std::size_t position) {
    return position < text.size() && (static_cast<unsigned char>(text[position]) & 0xC0U) == 0x80U;
  };
  std::size_t boundary = at;
  while (boundary > 0 && at - boundary < kMostFollowing && isFollowing(boundary)) --boundary;
  return isFollowing(boundary) ? at : boundary;
}

void appendUTF8(std::string& text, char32_t codePoint) {
  std::array<char, kLongestUTF8> bytes{};
  text.append(bytes.data(), putUTF8(bytes.data(), codePoint));
}

}  // namespace propertylist
