// How the binary reader makes values of objects whose bytes are all there.
#include <bit>
#include <cmath>
#include <cstring>

#include "propertylist/BinaryForm.h"
#include "propertylist/BinaryReader.h"
#include "propertylist/UTF8.h"

namespace propertylist {

using namespace binary;

bool BinaryReader::_makeASCII(Object& object, const Header& header) {
  const char* const contents = reinterpret_cast<const char*>(_bytes.data()) + header.contents;
  const auto size = static_cast<std::size_t>(header.count);
  bool isASCII = false;
  object.finish(_arena->newASCII(contents, size, isASCII));
  if (isASCII) return true;
  return _fail(header.contents + asciiPrefix({contents, size}, 0), "a character that is not ASCII");
}

bool BinaryReader::_makeUTF16(Object& object, const Header& header) {
  constexpr std::size_t kMostForAUnit = 3;
  const auto count = static_cast<std::size_t>(header.count);
  if (_wide.size() < count * kMostForAUnit) _wide.resize(count * kMostForAUnit);
  char* next = _wide.data();
  for (std::size_t i = 0; i < count; ++i) {
    const std::size_t at = header.contents + i * 2;
    const auto unit = static_cast<char32_t>(_number(at, 2));
    if (!isSurrogate(unit)) {
      next = putUTF8(next, unit);
      continue;
    }
    // Two of them make one character.
    if (unit >= kFirstLowSurrogate) return _fail(at, "half of a surrogate pair");
    if (++i == count) return _fail(header.at, "half of a surrogate pair");
    const auto low = static_cast<char32_t>(_number(at + 2, 2));
    if (!isSurrogate(low) || low < kFirstLowSurrogate)
      return _fail(at + 2, "half of a surrogate pair");
    next = putUTF8(next, 0x10000 + ((unit - 0xD800) << 10U) + (low - kFirstLowSurrogate));
  }
  object.finish(_arena->newText({_wide.data(), static_cast<std::size_t>(next - _wide.data())}));
  return true;
}

// What the marker alone tells the size of.
bool BinaryReader::_makeFixed(Object& object, Header& header) {
  switch (header.marker) {
    case kFalse:
    case kTrue:
      object.finish(Arena::scalar(Kind::boolean, header.marker == kTrue ? 1 : 0));
      return _claim(header, 0);
    case kDate:
      header.count = 8;
      return _claim(header, 1) && _makeDate(object, header);
    case kReal | 2U: {
      header.count = 4;
      if (!_claim(header, 1)) return false;
      const auto bits = static_cast<std::uint32_t>(_number(header.contents, 4));
      const auto real = static_cast<double>(std::bit_cast<float>(bits));
      object.finish(Arena::scalar(Kind::real, std::bit_cast<std::uint64_t>(real)));
      return true;
    }
    case kReal | 3U:
      header.count = 8;
      if (!_claim(header, 1)) return false;
      object.finish(Arena::scalar(Kind::real, _number(header.contents, 8)));
      return true;
    case kInteger | 0U:
    case kInteger | 1U:
    case kInteger | 2U:
    case kInteger | 3U:
    case kInteger | 4U:
      header.count = std::uint64_t{1} << (header.marker & 0x0FU);
      return _claim(header, 1) && _makeInteger(object, header);
    default:
      return _fail(header.at, "an object of an unknown type");
  }
}

bool BinaryReader::_makeDate(Object& object, const Header& header) {
  const std::uint64_t bits = _number(header.contents, 8);
  if (!std::isfinite(std::bit_cast<double>(bits)))
    return _fail(header.at, "a date that is no instant");
  object.finish(Arena::scalar(Kind::date, bits));
  return true;
}

// Integers of 1, 2 and 4 bytes are unsigned, those of 8 are signed. One of 16 has to be one that 64
// bits can hold, unsigned or signed.
bool BinaryReader::_makeInteger(Object& object, const Header& header) {
  const auto size = static_cast<std::size_t>(header.count);
  if (size < 8) {
    object.finish(Arena::scalar(Kind::integer, _number(header.contents, size)));
    return true;
  }
  const bool isWide = size == 16;
  const std::uint64_t low = _number(header.contents + (isWide ? 8 : 0), 8);
  const bool hasHighestBit = low >> 63U == 1;
  const std::uint64_t high =
      isWide ? _number(header.contents, 8) : (hasHighestBit ? ~std::uint64_t{0} : 0);
  const bool isNegative = high == ~std::uint64_t{0} && hasHighestBit;
  if (high != 0 && !isNegative) return _fail(header.at, "an integer of more than 64 bits");
  object.finish(Arena::integer(low, isNegative));
  return true;
}

}  // namespace propertylist
