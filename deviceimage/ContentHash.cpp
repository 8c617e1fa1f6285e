#include "deviceimage/ContentHash.h"

#include <nettle/base16.h>
#include <nettle/sha2.h>

#include <array>
#include <cstdint>

namespace deviceimage {

std::string contentHash(std::string_view content) {
  sha256_ctx hash;
  sha256_init(&hash);
  sha256_update(&hash, content.size(), reinterpret_cast<const std::uint8_t*>(content.data()));
  std::array<std::uint8_t, SHA256_DIGEST_SIZE> digest{};
  sha256_digest(&hash, digest.size(), digest.data());
  std::string digits(BASE16_ENCODE_LENGTH(SHA256_DIGEST_SIZE), '\0');
  base16_encode_update(digits.data(), digest.size(), digest.data());
  return digits;
}

}  // namespace deviceimage
