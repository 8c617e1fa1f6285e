// How the binary reader makes values of objects that were checked.
#include <bit>
#include <cstring>

#include "propertylist/BinaryForm.h"
#include "propertylist/BinaryReader.h"
#include "propertylist/UTF8.h"

namespace propertylist {

using namespace binary;

Arena::Raw BinaryReader::_make(const Header& header) {
  const auto contents = _bytes.subspan(header.contents);
  const auto count = static_cast<std::size_t>(header.count);
  switch (header.marker) {
    case kFalse:
      return Arena::scalar(Kind::boolean, 0);
    case kTrue:
      return Arena::scalar(Kind::boolean, 1);
    case kReal | 2U: {
      const float real =
          std::bit_cast<float>(static_cast<std::uint32_t>(_number(header.contents, 4)));
      return Arena::scalar(Kind::real, std::bit_cast<std::uint64_t>(static_cast<double>(real)));
    }
    case kReal | 3U:
      return Arena::scalar(Kind::real, _number(header.contents, 8));
    case kDate:
      return Arena::scalar(Kind::date, _number(header.contents, 8));
    case kData:
      return _arena->newData(contents.first(count));
    case kASCII:
      return _arena->newText(
          std::string_view(reinterpret_cast<const char*>(contents.data()), count));
    case kUTF16:
      return _wideText(header);
    default:
      return _integer(header);
  }
}

// Integers of 1, 2 and 4 bytes are unsigned, those of 8 are signed.
Arena::Raw BinaryReader::_integer(const Header& header) const {
  const std::size_t size = std::size_t{1} << (header.marker & 0x0FU);
  if (size < 8) return Arena::scalar(Kind::integer, _number(header.contents, size));
  const bool isWide = size == 16;
  const std::uint64_t low = _number(header.contents + (isWide ? 8 : 0), 8);
  const bool isNegative = isWide ? _number(header.contents, 8) != 0 : low >> 63U == 1;
  return Arena::scalar(Kind::integer, low, isNegative);
}

// The UTF-16 was checked. A first walk finds how many bytes of UTF-8 it takes.
Arena::Raw BinaryReader::_wideText(const Header& header) {
  const auto count = static_cast<std::size_t>(header.count);
  const auto unitAt = [&](std::size_t i) {
    return static_cast<char32_t>(_number(header.contents + i * 2, 2));
  };
  std::size_t size = 0;
  for (std::size_t i = 0; i < count; ++i) {
    const char32_t unit = unitAt(i);
    const bool isHalf = unit >= 0xD800 && unit <= 0xDFFF;  // two of which take four bytes
    size += unit < 0x80 ? 1 : unit < 0x800 || isHalf ? 2 : 3;
  }
  const Arena::NewText made = _arena->newText(size);
  char* next = made.characters;
  for (std::size_t i = 0; i < count; ++i) {
    char32_t unit = unitAt(i);
    if (unit >= 0xD800 && unit <= 0xDBFF)  // the other half follows
      unit = 0x10000 + ((unit - 0xD800) << 10U) + (unitAt(++i) - 0xDC00);
    next = putUTF8(next, unit);
  }
  return made.value;
}

}  // namespace propertylist
