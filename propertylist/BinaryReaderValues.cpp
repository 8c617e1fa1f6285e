// How the binary reader makes values of objects that were checked.
#include <bit>
#include <cstring>

#include "propertylist/BinaryForm.h"
#include "propertylist/BinaryReader.h"

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
      return _arena->newText(std::string_view(_wide).substr(0, _wideSize));  // by _checkLeaf
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

}  // namespace propertylist
