#include "propertylist/BinaryReader.h"

#include <algorithm>
#include <bit>
#include <cmath>
#include <string_view>
#include <unordered_map>

#include "propertylist/BinaryForm.h"
#include "propertylist/UTF8.h"

namespace propertylist {

using namespace binary;

namespace {

// Keys up to this size are compared wherever they come; see _sortLongKeys for the others.
constexpr std::size_t kLongKey = 64;

}  // namespace

ReadResult readBinaryPropertyList(std::span<const std::uint8_t> bytes) {
  return BinaryReader(bytes).read();
}

BinaryReader::BinaryReader(std::span<const std::uint8_t> bytes)
    : _bytes(bytes), _limit(std::max(kMinimumValueLimit, bytes.size())), _arena(3 * bytes.size()) {}

ReadResult BinaryReader::read() {
  if (!_readTrailer() || !_scan()) return {std::nullopt, _error};
  _sortLongKeys();
  return {_arena->value(_objects[static_cast<std::size_t>(_topObject)].raw()), {}};
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

// Following references

bool BinaryReader::_scan() {
  _objects.resize(static_cast<std::size_t>(_objectCount));
  if (!_reach(_objects[static_cast<std::size_t>(_topObject)], _topObject)) return false;
  while (!_way.empty()) {
    Step& step = _way.back();
    const std::uint64_t count = step.header.count;
    const bool isDictionary = step.object->kind == Kind::dictionary;
    if (isDictionary && step.nextReference < count) {
      if (!_followKey(step)) return false;
    } else if (step.nextReference < (isDictionary ? 2 * count : count)) {
      if (!_followValue(step)) return false;
    } else if (!_close()) {
      return false;
    }
  }
  return true;
}

// The object to which the reference points, reached or not; null when there is none.
BinaryReader::Object* BinaryReader::_objectAt(std::size_t placeOfReference) {
  const std::uint64_t number = _number(placeOfReference, _referenceSize);
  if (number < _objectCount) return &_objects[static_cast<std::size_t>(number)];
  _fail(placeOfReference, "a reference to an object that does not exist");
  return nullptr;
}

// Follows the references to all keys of a dictionary.
bool BinaryReader::_followKey(Step& step) {
  for (; step.nextReference < step.header.count; ++step.nextReference) {
    const auto index = static_cast<std::size_t>(step.nextReference);
    const std::size_t place = step.header.contents + index * _referenceSize;
    Object* const key = _objectAt(place);
    if (key == nullptr) return false;
    if (key->state == State::unknown) {
      const auto number = static_cast<std::uint64_t>(key - _objects.data());
      if (!_reach(*key, number)) return false;
    }
    if (key->kind != Kind::string) return _fail(place, "a key that is no string");
    const Arena::Raw text = key->raw();
    Arena::putKey(step.container, index, text);
    if (Arena::textOf(text).size() > kLongKey) step.hasLongKey = true;
  }
  return true;
}

// Follows the references to members, up to one that leads to a container not reached before.
bool BinaryReader::_followValue(Step& step) {
  const std::uint64_t end = step.header.count * (step.object->kind == Kind::dictionary ? 2 : 1);
  while (step.nextReference < end) {
    const std::size_t place =
        step.header.contents + static_cast<std::size_t>(step.nextReference) * _referenceSize;
    Object* const member = _objectAt(place);
    if (member == nullptr) return false;
    if (member->state == State::open) return _fail(place, "an object that contains itself");
    if (member->state == State::unknown) {
      const std::size_t containers = _way.size();
      if (!_reach(*member, static_cast<std::uint64_t>(member - _objects.data()))) return false;
      if (_way.size() > containers) return true;  // `step` is gone; it goes on when that is closed
    } else if (member->isContainer()) {
      Arena::noteShared(member->raw());
    }
    if (!_account(step, *member)) return false;
    _put(step, *member);
    ++step.nextReference;
  }
  return true;
}

// Makes the object under `number`, which was not reached before. A container is put at the end of
// the way.
bool BinaryReader::_reach(Object& object, std::uint64_t number) {
  const std::size_t entry = _offsetTable + static_cast<std::size_t>(number) * _offsetSize;
  const std::uint64_t at = _number(entry, _offsetSize);
  if (at < kMagic.size() || at >= _offsetTable) {
    return _fail(entry, "an object outside of its region");
  }
  Header header{};
  if (!_readHeader(static_cast<std::size_t>(at), header) || !_checkLeaf(header)) return false;
  if (header.marker != kArray && header.marker != kDictionary) {
    object.hold(_make(header));
    object.state = State::done;
    return true;
  }
  if (_way.size() >= kMaximumDepth) return _fail(header.at, "nested too deep");
  const auto count = static_cast<std::size_t>(header.count);
  const Arena::Raw container =
      header.marker == kArray ? _arena->newArray(count) : _arena->newDictionary(count);
  object.hold(container);
  object.state = State::open;
  object.depth = 1;
  _way.push_back({&object, header, container});
  return true;
}

// Adds a finished member to what its container stands for.
bool BinaryReader::_account(const Step& container, const Object& member) {
  Object& object = *container.object;
  object.values += member.values;  // both are within the limit, so their sum does not overflow
  if (object.values > _limit) return _fail(container.header.at, "too many values");
  object.depth = static_cast<std::uint16_t>(std::max<int>(object.depth, member.depth + 1));
  if (_way.size() + member.depth > kMaximumDepth) {
    return _fail(container.header.at, "nested too deep");
  }
  return true;
}

void BinaryReader::_put(const Step& container, const Object& member) {
  const auto index = static_cast<std::size_t>(container.nextReference);
  if (container.object->kind == Kind::array) {
    Arena::put(container.container, index, member.raw());
  } else {
    const auto count = static_cast<std::size_t>(container.header.count);
    Arena::putValue(container.container, index - count, member.raw());
  }
}

// Finishes the container at the end of the way and puts it into the one around it.
bool BinaryReader::_close() {
  const Step closed = _way.back();
  _way.pop_back();
  closed.object->state = State::done;
  if (closed.object->kind == Kind::dictionary) _sortDictionary(closed);
  if (_way.empty()) return true;
  Step& around = _way.back();
  if (!_account(around, *closed.object)) return false;
  _put(around, *closed.object);
  ++around.nextReference;
  return true;
}

void BinaryReader::_sortDictionary(const Step& step) {
  const auto count = static_cast<std::size_t>(step.header.count);
  if (step.hasLongKey) {
    _withLongKeys.push_back(step.container);
    return;
  }
  for (std::size_t i = 1; i < count; ++i) {
    if (!_areAscending(Arena::keyAt(step.container, i - 1), Arena::keyAt(step.container, i))) {
      Arena::sort(step.container, [](const auto& a, const auto& b) { return a.text < b.text; });
      return;
    }
  }
}

// Most keys follow the same ones in dictionary after dictionary.
bool BinaryReader::_areAscending(const Text& a, const Text& b) {
  const auto addresses =
      reinterpret_cast<std::uintptr_t>(&a) >> 4U ^ reinterpret_cast<std::uintptr_t>(&b) >> 6U;
  auto& known = _ascending[addresses % kPairs];
  if (known.first == &a && known.second == &b) return true;
  if (a >= b) return false;
  known = {&a, &b};
  return true;
}

// Sorts what waits for it by the places of the texts among all long keys: sorting each dictionary
// by its texts could cost far more than the size of the file when many share a few long keys.
void BinaryReader::_sortLongKeys() {
  std::vector<const Text*> keys;
  for (const Arena::Raw& dictionary : _withLongKeys) {
    for (std::size_t i = 0; i < Arena::sizeOf(dictionary); ++i) {
      const Text& key = Arena::keyAt(dictionary, i);
      if (key.size() > kLongKey) keys.push_back(&key);
    }
  }
  std::sort(keys.begin(), keys.end());
  keys.erase(std::unique(keys.begin(), keys.end()), keys.end());
  std::sort(keys.begin(), keys.end(), [](const Text* a, const Text* b) { return *a < *b; });
  std::unordered_map<const Text*, std::size_t> ranks;
  std::size_t rank = 0;
  for (std::size_t i = 0; i < keys.size(); ++i) {
    if (i > 0 && *keys[i - 1] != *keys[i]) ++rank;
    ranks.emplace(keys[i], rank);
  }
  const auto isBefore = [&](const auto& a, const auto& b) {
    const bool areLong = a.text.size() > kLongKey && b.text.size() > kLongKey;
    return areLong ? ranks.at(&a.text) < ranks.at(&b.text) : a.text < b.text;
  };
  for (const Arena::Raw& dictionary : _withLongKeys) Arena::sort(dictionary, isBefore);
}

// Headers

bool BinaryReader::_readHeader(std::size_t at, Header& header) {
  header = {_bytes[at], 0, at, at + 1};
  const std::uint8_t type = header.marker & 0xF0U;
  if (type == kData || type == kASCII || type == kUTF16 || type == kArray || type == kDictionary) {
    if (!_readCount(header)) return false;
    header.marker = type;
  }
  const std::optional<std::uint64_t> size = _sizeOf(header);
  if (!size) return _fail(at, "an object of an unknown type");
  if (*size > _offsetTable - header.contents) {
    return _fail(at, "an object that does not end before the offset table");
  }
  // Objects may overlap, but not so that a small file stands for a large amount of bytes.
  _bytesReached += header.contents - at + static_cast<std::size_t>(*size);
  return _bytesReached <= _limit || _fail(at, "objects that overlap without measure");
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
  if (header.marker == kUTF16) return _decodeUTF16(header);
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

// Puts the text into _wide, in UTF-8.
bool BinaryReader::_decodeUTF16(const Header& header) {
  constexpr std::size_t kMostForAUnit = 3;
  const auto count = static_cast<std::size_t>(header.count);
  if (_wide.size() < count * kMostForAUnit) _wide.resize(count * kMostForAUnit);
  char* next = _wide.data();
  char32_t high = 0;  // the first half of a pair, whose second half has to follow
  for (std::size_t i = 0; i < count; ++i) {
    const std::size_t at = header.contents + i * 2;
    const auto unit = static_cast<char32_t>(_number(at, 2));
    const bool isLow = unit >= 0xDC00 && unit <= 0xDFFF;
    if (isLow != (high != 0)) return _fail(at, "half of a surrogate pair");
    if (isLow) {
      next = putUTF8(next, 0x10000 + ((high - 0xD800) << 10U) + (unit - 0xDC00));
      high = 0;
    } else if (unit >= 0xD800 && unit <= 0xDBFF) {
      high = unit;
    } else {
      next = putUTF8(next, unit);
    }
  }
  if (high != 0) return _fail(header.at, "half of a surrogate pair");
  _wideSize = static_cast<std::size_t>(next - _wide.data());
  return true;
}

// Small things

bool BinaryReader::_fail(std::size_t at, std::string what) {
  _error.what = std::move(what);
  _error.byteOffset = at;
  return false;
}

}  // namespace propertylist
