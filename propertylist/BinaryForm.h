#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

// The layout of the binary form: the magic, the objects, the offset table, the trailer. All numbers
// are big-endian.
//
// An object is a marker byte and what it announces. The marker's high half says the type; its low
// half is a count, or kLongCount when an integer object with the count follows. Containers hold
// references: object numbers of a fixed size, a dictionary first all of its keys and then all of
// its values. The offset table gives the place of each object by its number.
namespace propertylist::binary {

inline constexpr std::string_view kMagic = "bplist00";

inline constexpr std::uint8_t kFalse = 0x08;
inline constexpr std::uint8_t kTrue = 0x09;
inline constexpr std::uint8_t kInteger = 0x10;  // low half: log2 of the size in bytes
inline constexpr std::uint8_t kReal = 0x20;     // low half: as above
inline constexpr std::uint8_t kDate = 0x33;     // 8 bytes, seconds since 2001
inline constexpr std::uint8_t kData = 0x40;
inline constexpr std::uint8_t kASCII = 0x50;
inline constexpr std::uint8_t kUTF16 = 0x60;  // counted in 16-bit units
inline constexpr std::uint8_t kArray = 0xA0;
inline constexpr std::uint8_t kDictionary = 0xD0;
inline constexpr std::uint8_t kLongCount = 0x0F;

// The trailer: five unused bytes, a sort version, and these.
inline constexpr std::size_t kTrailerSize = 32;
inline constexpr std::size_t kOffsetSizeAt = 6;     // 1 byte: size of an entry of the offset table
inline constexpr std::size_t kReferenceSizeAt = 7;  // 1 byte: size of a reference
inline constexpr std::size_t kObjectCountAt = 8;    // 8 bytes
inline constexpr std::size_t kTopObjectAt = 16;     // 8 bytes
inline constexpr std::size_t kOffsetTableAt = 24;   // 8 bytes

// The sizes that offsets and references come in.
inline std::size_t sizeFor(std::uint64_t largest) {
  if (largest <= 0xFF) return 1;
  if (largest <= 0xFFFF) return 2;
  return largest <= 0xFFFFFFFF ? 4 : 8;
}

}  // namespace propertylist::binary
