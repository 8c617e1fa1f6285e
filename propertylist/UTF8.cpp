#include "propertylist/UTF8.h"

namespace propertylist {
namespace {

// How many bytes follow a first byte, and the smallest code point that needs so many.
struct Form {
  std::size_t following;
  char32_t smallest;
  char32_t firstBits;
};

std::optional<Form> formOf(unsigned char first) {
  if (first < 0x80) return Form{0, 0, first};
  if (first >= 0xC2 && first <= 0xDF) return Form{1, 0x80, first & 0x1FU};
  if (first >= 0xE0 && first <= 0xEF) return Form{2, 0x800, first & 0x0FU};
  if (first >= 0xF0 && first <= 0xF4) return Form{3, 0x10000, first & 0x07U};
  return std::nullopt;
}

char byteOf(char32_t bits) { return static_cast<char>(static_cast<unsigned char>(bits)); }

}  // namespace

std::optional<char32_t> decodeUTF8(std::string_view text, std::size_t& position) {
  const std::optional<Form> form = formOf(static_cast<unsigned char>(text[position]));
  if (!form || text.size() - position <= form->following) return std::nullopt;
  char32_t codePoint = form->firstBits;
  for (std::size_t i = 1; i <= form->following; ++i) {
    const auto byte = static_cast<unsigned char>(text[position + i]);
    if ((byte & 0xC0U) != 0x80U) return std::nullopt;
    codePoint = (codePoint << 6U) | (byte & 0x3FU);
  }
  if (codePoint < form->smallest || !isScalarValue(codePoint)) return std::nullopt;
  position += form->following + 1;
  return codePoint;
}

std::optional<std::size_t> findInvalidUTF8(std::string_view text) {
  for (std::size_t position = 0; position < text.size();) {
    if (!decodeUTF8(text, position)) return position;
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

void appendUTF8(std::string& text, char32_t codePoint) {
  if (codePoint < 0x80) {
    text += byteOf(codePoint);
    return;
  }
  if (codePoint < 0x800) {
    text += byteOf(0xC0U | (codePoint >> 6U));
  } else {
    if (codePoint < 0x10000) {
      text += byteOf(0xE0U | (codePoint >> 12U));
    } else {
      text += byteOf(0xF0U | (codePoint >> 18U));
      text += byteOf(0x80U | ((codePoint >> 12U) & 0x3FU));
    }
    text += byteOf(0x80U | ((codePoint >> 6U) & 0x3FU));
  }
  text += byteOf(0x80U | (codePoint & 0x3FU));
}

}  // namespace propertylist
