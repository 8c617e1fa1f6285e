#pragma once

#include <string>
#include <string_view>

namespace deviceimage {

// The SHA-256 of `content` (FIPS 180-4) as 64 lower-case hexadecimal digits.
std::string contentHash(std::string_view content);

}  // namespace deviceimage
