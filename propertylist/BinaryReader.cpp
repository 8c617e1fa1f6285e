#include "propertylist/BinaryReader.h"

#include <algorithm>
#include <string_view>
#include <unordered_map>

#include "propertylist/BinaryForm.h"

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
  _unusedOfOffset = static_cast<unsigned>(64 - 8 * _offsetSize);
  _unusedOfReference = static_cast<unsigned>(64 - 8 * _referenceSize);
  _offsetTable = static_cast<std::size_t>(table);
  if (_objectCount == 0 || _objectCount > (trailer - _offsetTable) / _offsetSize) {
    return _fail(trailer + kObjectCountAt, "object count does not fit the offset table");
  }
  if (_topObject >= _objectCount) return _fail(trailer + kTopObjectAt, "no such top object");
  return true;
}

// Following references

bool BinaryReader::_scan() {
  constexpr std::size_t kUsualDepth = 8;
  _way.reserve(kUsualDepth);
  _objects.resize(static_cast<std::size_t>(_objectCount));
  if (!_reach(_objects[static_cast<std::size_t>(_topObject)], _topObject)) return false;
  while (!_way.empty()) {
    Step& step = _way.back();
    const std::uint64_t count = step.header.count;
    const bool isDictionary = step.object->kind == Kind::dictionary;
    if (isDictionary && step.nextReference < count) {
      if (!_followKeys(step)) return false;
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
  const std::uint64_t number = _numberBeforeTrailer(placeOfReference, _unusedOfReference);
  if (number < _objectCount) return &_objects[static_cast<std::size_t>(number)];
  _fail(placeOfReference, "a reference to an object that does not exist");
  return nullptr;
}

// Follows the references to all keys of a dictionary.
bool BinaryReader::_followKeys(Step& step) {
  const Object* previous = nullptr;
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
    if (previous != nullptr && step.isAscending && !step.hasLongKey)
      step.isAscending = _areAscending(*previous, *key);
    previous = key;
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
    if (member->isContainer()) {
      if (!_account(step, *member)) return false;
    } else if (++step.object->values > _limit) {
      return _fail(step.header.at, "too many values");
    }
    _put(step, *member);
    ++step.nextReference;
  }
  return true;
}

// Makes the object under `number`, which was not reached before. A container is put at the end of
// the way. One look at the marker decides, because no processor foresees what comes.
bool BinaryReader::_reach(Object& object, std::uint64_t number) {
  const std::size_t entry = _offsetTable + static_cast<std::size_t>(number) * _offsetSize;
  const std::uint64_t place = _numberBeforeTrailer(entry, _unusedOfOffset);
  if (place < kMagic.size() || place >= _offsetTable) {
    return _fail(entry, "an object outside of its region");
  }
  const auto at = static_cast<std::size_t>(place);
  Header header{_bytes[at], 0, at, at + 1};
  switch (header.marker & 0xF0U) {
    case kASCII:
      return _readCount(header) && _claim(header, 1) && _makeASCII(object, header);
    case kUTF16:
      return _readCount(header) && _claim(header, 2) && _makeUTF16(object, header);
    case kData:
      if (!_readCount(header) || !_claim(header, 1)) return false;
      object.finish(
          _arena->newData(_bytes.subspan(header.contents, static_cast<std::size_t>(header.count))));
      return true;
    case kArray:
      return _readCount(header) && _claim(header, _referenceSize) &&
             _enter(object, header, _arena->newArray(static_cast<std::size_t>(header.count)));
    case kDictionary:
      return _readCount(header) && _claim(header, 2 * _referenceSize) &&
             _enter(object, header, _arena->newDictionary(static_cast<std::size_t>(header.count)));
    default:
      return _makeFixed(object, header);
  }
}

// Puts a container, whose members are still to be followed, at the end of the way.
bool BinaryReader::_enter(Object& object, const Header& header, const Arena::Raw& container) {
  if (_way.size() >= kMaximumDepth) return _fail(header.at, "nested too deep");
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
  if (step.hasLongKey) {
    _withLongKeys.push_back(step.container);
  } else if (!step.isAscending) {
    Arena::sort(step.container, [](const auto& a, const auto& b) { return a.text < b.text; });
  }
}

// Most keys follow the same ones in dictionary after dictionary.
bool BinaryReader::_areAscending(const Object& a, const Object& b) {
  constexpr std::uint64_t kSpread = 0x9E3779B97F4A7C15;  // brings all bits to the highest ones
  const auto first = static_cast<std::uint64_t>(&a - _objects.data()) + 1;
  const auto second = static_cast<std::uint64_t>(&b - _objects.data()) + 1;
  const std::uint64_t pair = first << 32U | second;  // a file has fewer than 2^32 objects
  std::uint64_t& known = _ascending[pair * kSpread >> (64 - kPairBits)];
  if (known == pair) return true;
  if (Arena::textOf(a.raw()) >= Arena::textOf(b.raw())) return false;
  known = pair;
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

// Reads the count that follows a marker.
bool BinaryReader::_readLongCount(Header& header) {
  std::size_t& at = header.contents;
  if (at >= _offsetTable) return _fail(at, "a count outside of its region");
  const std::uint8_t marker = _bytes[at];
  if (marker < kInteger || marker > (kInteger | 3U)) return _fail(at, "a count that is no integer");
  const std::size_t size = std::size_t{1} << (marker & 0x0FU);
  if (size > _offsetTable - at - 1) return _fail(at, "a count outside of its region");
  header.count = _number(at + 1, size);
  at += 1 + size;
  return true;
}

// Small things

bool BinaryReader::_fail(std::size_t at, const char* what) {
  _error.what = what;
  _error.byteOffset = at;
  return false;
}

}  // namespace propertylist
