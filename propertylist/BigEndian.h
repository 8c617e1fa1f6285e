#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace propertylist {

// The number in `size` bytes, at most 8, the highest first.
inline std::uint64_t bigEndianNumber(const std::uint8_t* bytes, std::size_t size) {
  switch (size) {
    case 1:
      return bytes[0];
    case 2:
      return static_cast<std::uint64_t>(bytes[0]) << 8U | bytes[1];
    case 4: {
      std::uint32_t number = 0;
      std::memcpy(&number, bytes, sizeof number);
      return __builtin_bswap32(number);
    }
    case 8: {
      std::uint64_t number = 0;
      std::memcpy(&number, bytes, sizeof number);
      return __builtin_bswap64(number);
    }
    default: {
      std::uint64_t number = 0;
      for (std::size_t i = 0; i < size; ++i) number = number << 8U | bytes[i];
      return number;
    }
  }
}

inline void putBigEndian(std::uint8_t* to, std::uint64_t number, std::size_t size) {
  const std::uint64_t swapped = __builtin_bswap64(number) >> (8 - size) * 8;
  switch (size) {
    case 1:
      to[0] = static_cast<std::uint8_t>(swapped);
      return;
    case 2:
      std::memcpy(to, &swapped, 2);
      return;
    case 4:
      std::memcpy(to, &swapped, 4);
      return;
    default:
      std::memcpy(to, &swapped, size);
  }
}

}  // namespace propertylist
