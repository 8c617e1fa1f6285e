#include "propertylist/BinaryWriter.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstring>

#include "propertylist/BigEndian.h"
#include "propertylist/BinaryForm.h"
#include "propertylist/Reading.h"
#include "propertylist/UTF8.h"
#include "propertylist/ValueCount.h"
#include "propertylist/Writing.h"

namespace propertylist {

using namespace binary;

namespace {

// Texts and data up to this size are found faster by content than by address and content.
constexpr std::size_t kShort = 64;
// Of how many texts the place in memory is remembered at most. A power of two.
constexpr std::size_t kMostRecent = 1024;

// The sizes that offsets and references come in.
std::size_t sizeFor(std::uint64_t largest) {
  if (largest <= 0xFF) return 1;
  if (largest <= 0xFFFF) return 2;
  return largest <= 0xFFFFFFFF ? 4 : 8;
}

std::string_view viewOf(const Bytes& data) {
  return {reinterpret_cast<const char*>(data.data()), data.size()};
}

bool isScalar(Kind kind) {
  return kind == Kind::integer || kind == Kind::real || kind == Kind::boolean || kind == Kind::date;
}

// Of the kind and the number that the scalar holds.
std::uint64_t hashOfScalar(const Value& value) {
  std::uint64_t bits = 0;
  bool isNegative = false;
  if (value.kind() == Kind::real) {
    bits = std::bit_cast<std::uint64_t>(*value.asReal());
  } else if (value.kind() == Kind::date) {
    bits = std::bit_cast<std::uint64_t>(value.asDate()->secondsSince2001);
  } else if (value.kind() == Kind::boolean) {
    bits = *value.asBoolean() ? 1 : 0;
  } else if (const auto positive = value.asUnsigned()) {
    bits = *positive;
  } else {
    bits = static_cast<std::uint64_t>(*value.asInteger());
    isNegative = true;  // tells it from a large one
  }
  return TextTable::hashOf(bits,
                           static_cast<std::uint64_t>(value.kind()) * 2 + (isNegative ? 1 : 0));
}

std::size_t sizeOf(const Value& container) {
  const Array* const array = container.asArray();
  return array != nullptr ? array->size() : container.asDictionary()->size();
}

}  // namespace

std::optional<Bytes> writeBinaryPropertyList(const Value& value) {
  return BinaryWriter(value).write();
}

std::optional<Bytes> BinaryWriter::write() {
  // Each value takes a byte at least, so a value of more would only be laid out to be refused.
  const std::uint64_t values = countValues(_value, kMaximumFileSize);
  if (values > kMaximumFileSize) return std::nullopt;
  _makeRoomFor(static_cast<std::size_t>(values));
  if (!_number()) return std::nullopt;
  _referenceSize = sizeFor(_objects.size() - 1);
  if (_references.size() * _referenceSize > kMaximumFileSize) return std::nullopt;
  _bytes.resize(_expectedSize());
  _putBytes(kMagic.data(), kMagic.size());
  _offsets.reserve(_objects.size());
  for (std::size_t i = 0; i < _objects.size(); ++i) {
    constexpr std::size_t kAhead = 16;
    if (i + kAhead < _objects.size()) __builtin_prefetch(_objects[i + kAhead].place());
    _offsets.push_back(static_cast<std::uint32_t>(_end));
    if (!_put(_objects[i]) || _end > kMaximumFileSize) return std::nullopt;
  }
  _putOffsetsAndTrailer();
  if (_end > kMaximumFileSize) return std::nullopt;
  _bytes.resize(_end);
  return std::move(_bytes);
}

// For what most files of so many values need.
void BinaryWriter::_makeRoomFor(std::size_t values) {
  constexpr std::size_t kMost = std::size_t{1} << 22U;
  const std::size_t expected = std::min(values, kMost);
  _objects.reserve(expected);
  _references.reserve(2 * expected);
  _texts.makeRoomFor(expected / 6);
  _recent.resize(std::min(kMostRecent, std::bit_ceil(expected)));
}

// Somewhat more than most files take, so that what is written need not move while it grows: a head
// of four bytes and an offset of as many for each object, and every eighth letter in UTF-16.
std::size_t BinaryWriter::_expectedSize() const {
  return std::min(kMaximumFileSize, _objects.size() * 8 + _contentBytes / 8 * 9 +
                                        _references.size() * _referenceSize);
}

// Numbering

bool BinaryWriter::_number() {
  if (!_numberOf(_value, 1)) return false;
  for (std::size_t i = 0; i < _objects.size(); ++i) {
    if (_objects[i].depth > 0 && !_numberMembers(i)) return false;
  }
  return true;
}

bool BinaryWriter::_numberMembers(std::size_t container) {
  const Value& value = _objects[container].value();
  const std::uint32_t depth = _objects[container].depth;
  _objects[container].firstReference = static_cast<std::uint32_t>(_references.size());
  if (const Array* const array = value.asArray())
    return _referToValues(
        *array, depth + 1, [](const Value& member) -> auto& { return member; });
  const Dictionary& dictionary = *value.asDictionary();
  for (const Dictionary::Entry& entry : dictionary)
    _references.push_back(_numberOfText(entry.key()));
  return _referToValues(
      dictionary, depth + 1, [](const Dictionary::Entry& entry) -> auto& { return entry.value(); });
}

// Hashes some values before it looks the first one up: in a large list each is somewhere else in
// memory, and comes from there while the next ones are hashed.
template <typename Members, typename ValueOf>
bool BinaryWriter::_referToValues(const Members& members, std::uint32_t depth,
                                  const ValueOf& valueOf) {
  constexpr std::ptrdiff_t kAhead = 16;
  std::array<std::optional<std::uint64_t>, kAhead> hashes;
  for (auto from = members.begin(); from != members.end();) {
    const auto to = from + std::min(kAhead, members.end() - from);
    std::transform(from, to, hashes.begin(),
                   [&](const auto& member) { return _hashAhead(valueOf(member)); });
    for (auto hash = hashes.begin(); from != to; ++from, ++hash) {
      const std::optional<Number> number = _numberOf(valueOf(*from), depth, *hash);
      if (!number) return false;
      _references.push_back(*number);
    }
  }
  return true;
}

// The hash of a text or scalar that has to be looked up by its content.
std::optional<std::uint64_t> BinaryWriter::_hashAhead(const Value& value) {
  if (const Text* const text = value.asString()) {
    if (text->size() > kShort || _recentAt(*text).text == text) return std::nullopt;
    const std::uint64_t hash = TextTable::hashOf(*text);
    _texts.prefetch(hash);
    return hash;
  }
  if (!isScalar(value.kind())) return std::nullopt;
  const std::uint64_t hash = hashOfScalar(value);
  _scalars.prefetch(hash);
  return hash;
}

// The number of `value`, which is a new one for a container. `depth` counts `value` if it is one.
std::optional<BinaryWriter::Number> BinaryWriter::_numberOf(const Value& value, std::uint32_t depth,
                                                            std::optional<std::uint64_t> hash) {
  switch (value.kind()) {
    case Kind::dictionary:
    case Kind::array:
      if (depth > kMaximumDepth) return std::nullopt;
      return _add(Object(value, static_cast<std::uint16_t>(depth)));
    case Kind::string:
      return _numberOfText(*value.asString(), hash);
    case Kind::data:
      return _numberOfData(*value.asData(), value);
    default:
      return _numberOfScalar(value, hash);
  }
}

// Where a text is remembered that stands at the same place: it is the same, and is not looked at.
// So are most keys, and much of what accounts have in common.
BinaryWriter::Recent& BinaryWriter::_recentAt(const Text& text) {
  const auto address = reinterpret_cast<std::uintptr_t>(&text);
  return _recent[(address >> 4U ^ address >> 14U) & (_recent.size() - 1)];
}

BinaryWriter::Number BinaryWriter::_numberOfText(const Text& text,
                                                 std::optional<std::uint64_t> hash) {
  Recent& recent = _recentAt(text);
  if (recent.text != &text) recent = {&text, _numberOfNewText(text, hash)};
  return recent.number;
}

BinaryWriter::Number BinaryWriter::_numberOfNewText(const Text& text,
                                                    std::optional<std::uint64_t> hash) {
  if (text.size() > kShort) {
    const auto known = _byAddress.find(&text);
    if (known != _byAddress.end()) return known->second;
  }
  if (!hash) hash = TextTable::hashOf(text);
  std::size_t known =
      _texts.find(*hash, [&](std::size_t number) { return *_objects[number].text() == text; });
  if (known == TextTable::kNone) {
    known = _add(Object(text));
    _contentBytes += text.size();
    _texts.add(*hash, known);
  }
  if (text.size() > kShort) _byAddress.emplace(&text, static_cast<Number>(known));
  return static_cast<Number>(known);
}

BinaryWriter::Number BinaryWriter::_numberOfData(const Bytes& data, const Value& value) {
  if (data.size() > kShort) {
    const auto known = _byAddress.find(&data);
    if (known != _byAddress.end()) return known->second;
  }
  const std::uint64_t hash = TextTable::hashOf(viewOf(data));
  std::size_t known = _datas.find(
      hash, [&](std::size_t number) { return *_objects[number].value().asData() == data; });
  if (known == TextTable::kNone) {
    known = _add(Object(value));
    _datas.add(hash, known);
    _contentBytes += data.size();
  }
  if (data.size() > kShort) _byAddress.emplace(&data, static_cast<Number>(known));
  return static_cast<Number>(known);
}

std::optional<BinaryWriter::Number> BinaryWriter::_numberOfScalar(
    const Value& value, std::optional<std::uint64_t> hash) {
  if (const auto date = value.asDate(); date && !std::isfinite(date->secondsSince2001))
    return std::nullopt;
  if (!hash) hash = hashOfScalar(value);
  std::size_t known =
      _scalars.find(*hash, [&](std::size_t number) { return _objects[number].value() == value; });
  if (known == TextTable::kNone) {
    known = _add(Object(value));
    _scalars.add(*hash, known);
  }
  return static_cast<Number>(known);
}

BinaryWriter::Number BinaryWriter::_add(const Object& object) {
  _objects.push_back(object);
  return static_cast<Number>(_objects.size() - 1);
}

// Putting

// False for a text that is not UTF-8.
bool BinaryWriter::_put(const Object& object) {
  if (object.text() != nullptr) return _putText(*object.text());
  const Value& value = object.value();
  switch (value.kind()) {
    case Kind::dictionary:
      _putHead(kDictionary, sizeOf(value));
      _putReferences(object, sizeOf(value) * 2);
      break;
    case Kind::array:
      _putHead(kArray, sizeOf(value));
      _putReferences(object, sizeOf(value));
      break;
    case Kind::string:  // has a text
      break;
    case Kind::integer:
      _putInteger(value);
      break;
    case Kind::real:
      _putNumber(kReal | 3U, 1);
      _putNumber(std::bit_cast<std::uint64_t>(*value.asReal()), 8);
      break;
    case Kind::boolean:
      _putNumber(*value.asBoolean() ? kTrue : kFalse, 1);
      break;
    case Kind::date:
      _putNumber(kDate, 1);
      _putNumber(std::bit_cast<std::uint64_t>(value.asDate()->secondsSince2001), 8);
      break;
    case Kind::data:
      _putHead(kData, value.asData()->size());
      _putBytes(value.asData()->data(), value.asData()->size());
      break;
  }
  return true;
}

// ASCII where that is enough, else UTF-16.
bool BinaryWriter::_putText(std::string_view text) {
  if (!isASCII(text)) return _putWideText(text);
  _putHead(kASCII, text.size());
  _putBytes(text.data(), text.size());
  return true;
}

bool BinaryWriter::_putWideText(std::string_view text) {
  constexpr std::size_t kUnit = 2;
  if (_wide.size() < text.size() * kUnit) _wide.resize(text.size() * kUnit);
  std::uint8_t* to = _wide.data();
  const auto put = [&to](char32_t unit) {
    *to++ = static_cast<std::uint8_t>(unit >> 8U);
    *to++ = static_cast<std::uint8_t>(unit);
  };
  for (std::size_t position = 0; position < text.size();) {
    const std::optional<char32_t> codePoint = decodeUTF8(text, position);
    if (!codePoint) return false;
    if (*codePoint < 0x10000) {
      put(*codePoint);
    } else {
      put(0xD800 + ((*codePoint - 0x10000) >> 10U));
      put(0xDC00 + ((*codePoint - 0x10000) & 0x3FFU));
    }
  }
  const auto size = static_cast<std::size_t>(to - _wide.data());
  _putHead(kUTF16, size / kUnit);
  _putBytes(_wide.data(), size);
  return true;
}

// Integers of 1, 2 and 4 bytes are unsigned, those of 8 are signed. What is above takes 16.
void BinaryWriter::_putInteger(const Value& integer) {
  if (const auto negative = integer.asInteger(); negative && *negative < 0) {
    _putNumber(kInteger | 3U, 1);
    return _putNumber(static_cast<std::uint64_t>(*negative), 8);
  }
  const std::uint64_t number = *integer.asUnsigned();
  if (number >> 63U == 0) return _putCount(number);
  _putNumber(kInteger | 4U, 1);
  _putNumber(0, 8);
  _putNumber(number, 8);
}

void BinaryWriter::_putReferences(const Object& container, std::size_t count) {
  std::uint8_t* room = _room(count * _referenceSize);
  for (std::size_t i = 0; i < count; ++i, room += _referenceSize)
    putBigEndian(room, _references[container.firstReference + i], _referenceSize);
}

void BinaryWriter::_putHead(std::uint8_t type, std::uint64_t count) {
  if (count < kLongCount) {
    return _putNumber(type | count, 1);
  }
  _putNumber(type | kLongCount, 1);
  _putCount(count);
}

// An integer object of the smallest size; `count` is not above the signed range.
void BinaryWriter::_putCount(std::uint64_t count) {
  const std::size_t size = sizeFor(count);
  _putNumber(kInteger | static_cast<std::uint64_t>(std::countr_zero(size)), 1);
  _putNumber(count, size);
}

void BinaryWriter::_putNumber(std::uint64_t number, std::size_t size) {
  putBigEndian(_room(size), number, size);
}

void BinaryWriter::_putBytes(const void* bytes, std::size_t size) {
  if (size > 0) std::memcpy(_room(size), bytes, size);
}

// Room for so many bytes more, which count as written.
std::uint8_t* BinaryWriter::_room(std::size_t size) {
  if (_bytes.size() - _end < size) _bytes.resize(std::max(_bytes.size() * 2, _end + size));
  std::uint8_t* const room = _bytes.data() + _end;
  _end += size;
  return room;
}

void BinaryWriter::_putOffsetsAndTrailer() {
  const std::uint64_t table = _end;
  const std::size_t offsetSize = sizeFor(_offsets.back());
  std::uint8_t* room = _room(_offsets.size() * offsetSize);
  for (const std::uint32_t offset : _offsets) {
    putBigEndian(room, offset, offsetSize);
    room += offsetSize;
  }
  _putNumber(0, kOffsetSizeAt);
  _putNumber(offsetSize, 1);
  _putNumber(_referenceSize, 1);
  _putNumber(_objects.size(), 8);
  _putNumber(0, 8);  // the top object
  _putNumber(table, 8);
}

}  // namespace propertylist
