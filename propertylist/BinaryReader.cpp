#include "propertylist/BinaryReader.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <string_view>
#include <utility>

#include "propertylist/BinaryForm.h"
#include "propertylist/UTF8.h"

namespace propertylist {

using namespace binary;

ReadResult readBinaryPropertyList(std::span<const std::uint8_t> bytes) {
  return BinaryReader(bytes).read();
}

BinaryReader::BinaryReader(std::span<const std::uint8_t> bytes)
    : _bytes(bytes), _limit(std::max(kMinimumValueLimit, bytes.size())) {}

ReadResult BinaryReader::read() {
  if (!_readTrailer() || !_scan()) return {std::nullopt, _error};
  _rankKeys();
  for (const std::uint32_t object : _order) _build(_objects[object]);
  return {std::move(_objects.front().value), {}};
}

bool BinaryReader::_readTrailer() {
  const bool hasMagic =
      _bytes.size() >= kMagic.size() && std::equal(kMagic.begin(), kMagic.end(), _bytes.begin());
  if (_bytes.size() > kMaximumFileSize) return _fail(kMaximumFileSize, "too large");
  if (!hasMagic) return _fail(0, "not a binary property list of a known version");
  if (_bytes.size() < kMagic.size() + kTrailerSize) return _fail(_bytes.size(), "cut short");
  const std::size_t trailer = _bytes.size() - kTrailerSize;
  _offsetSize = _bytes[trailer + kOffsetSizeAt];
  _referenceSize = _bytes[trailer + kReferenceSizeAt];
  _objectCount = _number(trailer + kObjectCountAt, 8);
  _topObject = _number(trailer + kTopObjectAt, 8);
  const std::uint64_t table = _number(trailer + kOffsetTableAt, 8);
  if (_offsetSize < 1 || _offsetSize > 8) return _fail(trailer + kOffsetSizeAt, "bad offset size");
  if (_referenceSize < 1 || _referenceSize > 8) {
    return _fail(trailer + kReferenceSizeAt, "bad reference size");
  }
  if (table <= kMagic.size() || table > trailer) {
    return _fail(trailer + kOffsetTableAt, "offset table out of place");
  }
  _offsetTable = static_cast<std::size_t>(table);
  if (_objectCount == 0 || _objectCount > (trailer - _offsetTable) / _offsetSize) {
    return _fail(trailer + kObjectCountAt, "object count does not fit the offset table");
  }
  if (_topObject >= _objectCount) return _fail(trailer + kTopObjectAt, "no such top object");
  return true;
}

// First pass

bool BinaryReader::_scan() {
  _objectOfNumber.resize(static_cast<std::size_t>(_objectCount));
  std::vector<Step> way;
  bool isNew = false;
  const std::size_t trailer = _bytes.size() - kTrailerSize;
  const std::optional<std::uint32_t> top = _reach(_topObject, trailer + kTopObjectAt, isNew);
  if (!top) return false;
  if (_isContainer(_objects[*top].header)) {
    way.push_back({*top, 0});
  } else {
    _close(*top);
  }
  while (!way.empty()) {
    Step& step = way.back();
    const std::uint32_t index = step.object;
    if (step.nextReference < _referenceCount(_objects[index].header)) {
      const Step current = step;
      ++step.nextReference;
      if (!_follow(current, way)) return false;
      continue;
    }
    _close(index);
    way.pop_back();
    if (way.empty()) break;
    if (!_account(_objects[way.back().object], _objects[index], way.size())) return false;
  }
  return true;
}

// Follows one reference of the container at the end of `way`, which grows when it leads to a
// container that was not reached before.
bool BinaryReader::_follow(Step step, std::vector<Step>& way) {
  const Header header = _objects[step.object].header;
  const std::size_t place = _placeOfReference(header, step.nextReference);
  bool isNew = false;
  const std::optional<std::uint32_t> reached = _reach(_number(place, _referenceSize), place, isNew);
  if (!reached) return false;
  Object& member = _objects[*reached];
  if (header.marker == kDictionary && step.nextReference < header.count) {
    if (!_isString(member.header)) return _fail(place, "a key that is no string");
    if (isNew) _close(*reached);
    if (!std::exchange(member.isKey, true)) _keys.push_back(*reached);
    return true;
  }
  if (!isNew && member.isOpen) return _fail(place, "an object that contains itself");
  if (isNew && _isContainer(member.header)) {
    if (way.size() >= kMaximumDepth) return _fail(member.header.at, "nested too deep");
    way.push_back({*reached, 0});
    return true;
  }
  if (isNew) _close(*reached);
  return _account(_objects[step.object], member, way.size());
}

// The object under `number`, to which the reference at `from` points.
std::optional<std::uint32_t> BinaryReader::_reach(std::uint64_t number, std::size_t from,
                                                  bool& isNew) {
  isNew = false;
  if (number >= _objectCount) {
    _fail(from, "a reference to an object that does not exist");
    return std::nullopt;
  }
  std::uint32_t& known = _objectOfNumber[static_cast<std::size_t>(number)];
  if (known != 0) return known - 1;
  const std::size_t entry = _offsetTable + static_cast<std::size_t>(number) * _offsetSize;
  const std::uint64_t at = _number(entry, _offsetSize);
  if (at < kMagic.size() || at >= _offsetTable) {
    _fail(entry, "an object outside of its region");
    return std::nullopt;
  }
  const std::optional<Header> header = _readHeader(static_cast<std::size_t>(at));
  if (!header || !_checkLeaf(*header)) return std::nullopt;
  Object object;
  object.header = *header;
  object.isOpen = _isContainer(*header);
  object.depth = object.isOpen ? 1 : 0;
  _objects.push_back(std::move(object));
  known = static_cast<std::uint32_t>(_objects.size());
  isNew = true;
  return known - 1;
}

void BinaryReader::_close(std::uint32_t object) {
  _objects[object].isOpen = false;
  _order.push_back(object);
}

// Adds a finished member to what its container stands for.
bool BinaryReader::_account(Object& container, const Object& member, std::size_t containersAbove) {
  container.values += member.values;  // both are within the limit, so their sum does not overflow
  if (container.values > _limit) return _fail(container.header.at, "too many values");
  container.depth = std::max(container.depth, member.depth + 1);
  if (containersAbove + member.depth > kMaximumDepth) {
    return _fail(container.header.at, "nested too deep");
  }
  return true;
}

// Headers

std::optional<BinaryReader::Header> BinaryReader::_readHeader(std::size_t at) {
  Header header{_bytes[at], 0, at, at + 1};
  const std::uint8_t type = header.marker & 0xF0U;
  if (type == kData || type == kASCII || type == kUTF16 || type == kArray || type == kDictionary) {
    if (!_readCount(header)) return std::nullopt;
    header.marker = type;
  }
  const std::optional<std::uint64_t> size = _sizeOf(header);
  if (!size) {
    _fail(at, "an object of an unknown type");
    return std::nullopt;
  }
  if (*size > _offsetTable - header.contents) {
    _fail(at, "an object that does not end before the offset table");
    return std::nullopt;
  }
  // Objects may overlap, but not so that a small file stands for a large amount of bytes.
  _bytesReached += header.contents - at + static_cast<std::size_t>(*size);
  if (_bytesReached > _limit) {
    _fail(at, "objects that overlap without measure");
    return std::nullopt;
  }
  return header;
}

// Reads the count that a marker holds or that follows it.
bool BinaryReader::_readCount(Header& header) {
  std::size_t& at = header.contents;
  header.count = header.marker & 0x0FU;
  if (header.count != kLongCount) return true;
  if (at >= _offsetTable) return _fail(at, "a count outside of its region");
  const std::uint8_t marker = _bytes[at];
  if (marker < kInteger || marker > (kInteger | 3U)) return _fail(at, "a count that is no integer");
  const std::size_t size = std::size_t{1} << (marker & 0x0FU);
  if (size > _offsetTable - at - 1) return _fail(at, "a count outside of its region");
  header.count = _number(at + 1, size);
  at += 1 + size;
  return true;
}

// How many bytes the contents take; empty for a type that no property list has. A count that no
// file could hold is answered with a size that no file has.
std::optional<std::uint64_t> BinaryReader::_sizeOf(const Header& header) const {
  const std::uint64_t count = std::min(header.count, std::uint64_t{_bytes.size()} + 1);
  switch (header.marker) {
    case kFalse:
    case kTrue:
      return 0;
    case kDate:
      return 8;
    case kReal | 2U:
    case kReal | 3U:
    case kInteger | 0U:
    case kInteger | 1U:
    case kInteger | 2U:
    case kInteger | 3U:
    case kInteger | 4U:
      return std::uint64_t{1} << (header.marker & 0x0FU);
    case kData:
    case kASCII:
      return count;
    case kUTF16:
      return count * 2;
    case kArray:
      return count * _referenceSize;
    case kDictionary:
      return count * 2 * _referenceSize;
    default:
      return std::nullopt;
  }
}

bool BinaryReader::_checkLeaf(const Header& header) {
  if (header.marker == (kInteger | 4U)) return _checkInteger(header);
  if (header.marker == kUTF16) return _checkUTF16(header);
  if (header.marker == kASCII) {
    const std::string_view text(reinterpret_cast<const char*>(_bytes.data()) + header.contents,
                                static_cast<std::size_t>(header.count));
    const std::size_t good = asciiPrefix(text, 0);
    return good == text.size() || _fail(header.contents + good, "a character that is not ASCII");
  }
  if (header.marker == kDate &&
      !std::isfinite(std::bit_cast<double>(_number(header.contents, 8)))) {
    return _fail(header.at, "a date that is no instant");
  }
  return true;
}

// A wide integer has to be one that 64 bits can hold, unsigned or signed.
bool BinaryReader::_checkInteger(const Header& header) {
  const std::uint64_t high = _number(header.contents, 8);
  const std::uint64_t low = _number(header.contents + 8, 8);
  const bool isNegative = high == ~std::uint64_t{0} && (low >> 63U) == 1;
  return high == 0 || isNegative || _fail(header.at, "an integer of more than 64 bits");
}

bool BinaryReader::_checkUTF16(const Header& header) {
  bool afterHigh = false;
  for (std::uint64_t i = 0; i < header.count; ++i) {
    const std::size_t at = header.contents + static_cast<std::size_t>(i) * 2;
    const std::uint64_t unit = _number(at, 2);
    const bool isLow = unit >= 0xDC00 && unit <= 0xDFFF;
    if (isLow != afterHigh) return _fail(at, "half of a surrogate pair");
    afterHigh = unit >= 0xD800 && unit <= 0xDBFF;
  }
  return !afterHigh || _fail(header.at, "half of a surrogate pair");
}

// Small things

bool BinaryReader::_isContainer(const Header& header) {
  return header.marker == kArray || header.marker == kDictionary;
}

bool BinaryReader::_isString(const Header& header) {
  return header.marker == kASCII || header.marker == kUTF16;
}

std::uint64_t BinaryReader::_referenceCount(const Header& header) {
  return header.marker == kDictionary ? header.count * 2 : header.count;
}

std::size_t BinaryReader::_placeOfReference(const Header& header, std::uint64_t index) const {
  return header.contents + static_cast<std::size_t>(index) * _referenceSize;
}

bool BinaryReader::_fail(std::size_t at, std::string what) {
  _error.what = std::move(what);
  _error.byteOffset = at;
  return false;
}

}  // namespace propertylist
