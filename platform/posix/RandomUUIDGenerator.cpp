#include "platform/posix/RandomUUIDGenerator.h"

#include <sys/random.h>

#include <array>
#include <cerrno>
#include <cstdint>

namespace platform {
namespace {

using UUIDBytes = std::array<std::uint8_t, 16>;

bool fillWithRandom(UUIDBytes& bytes) {
  ssize_t count = 0;
  do {
    count = ::getrandom(bytes.data(), bytes.size(), 0);
  } while (count < 0 && errno == EINTR);
  return count == static_cast<ssize_t>(bytes.size());  // so few bytes come in one piece
}

}  // namespace

std::optional<std::string> RandomUUIDGenerator::generateUUID() {
  UUIDBytes bytes = {};
  if (!fillWithRandom(bytes)) return std::nullopt;
  bytes[6] = static_cast<std::uint8_t>((bytes[6] & 0x0FU) | 0x40U);  // version 4
  bytes[8] = static_cast<std::uint8_t>((bytes[8] & 0x3FU) | 0x80U);  // the usual variant

  constexpr std::string_view kDigits = "0123456789ABCDEF";
  std::string text;
  for (std::size_t i = 0; i < bytes.size(); ++i) {
    if (i == 4 || i == 6 || i == 8 || i == 10) text += '-';
    text += kDigits[bytes[i] >> 4U];
    text += kDigits[bytes[i] & 0x0FU];
  }
  return text;
}

}  // namespace platform
