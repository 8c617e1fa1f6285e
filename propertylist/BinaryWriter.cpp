#include "propertylist/BinaryWriter.h"

#include <algorithm>
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
// Of how many texts the place in memory is remembered. A power of two.
constexpr std::size_t kRecent = 1024;

// The sizes that offsets and references come in.
std::size_t sizeFor(std::uint64_t largest) {
  if (largest <= 0xFF) return 1;
  if (largest <= 0xFFFF) return 2;
  return largest <= 0xFFFFFFFF ? 4 : 8;
}

std::string_view viewOf(const Bytes& data) {
  return {reinterpret_cast<const char*>(data.data()), data.size()};
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
  if (countValues(_value, kMaximumFileSize) > kMaximumFileSize || !_number()) return std::nullopt;
  _referenceSize = sizeFor(_objects.size() - 1);
  if (_references.size() * _referenceSize > kMaximumFileSize) return std::nullopt;
  _putBytes(kMagic.data(), kMagic.size());
  _offsets.reserve(_objects.size());
  for (const Object& object : _objects) {
    _offsets.push_back(_end);
    _put(object);
    if (_end > kMaximumFileSize) return std::nullopt;
  }
  _putOffsetsAndTrailer();
  if (_end > kMaximumFileSize) return std::nullopt;
  _bytes.resize(_end);
  return std::move(_bytes);
}

// Numbering

bool BinaryWriter::_number() {
  _recent.resize(kRecent);
  if (!_numberOf(_value, 1)) return false;
  for (std::size_t i = 0; i < _objects.size(); ++i) {
    const Value* const value = _objects[i].value;
    const bool isContainer =
        value != nullptr && (value->kind() == Kind::array || value->kind() == Kind::dictionary);
    if (isContainer && !_numberMembers(i)) return false;
  }
  return true;
}

bool BinaryWriter::_numberMembers(std::size_t container) {
  const Value& value = *_objects[container].value;
  const std::uint32_t depth = _objects[container].depth;
  _objects[container].firstReference = static_cast<std::uint32_t>(_references.size());
  if (const Array* const array = value.asArray()) {
    return std::all_of(array->begin(), array->end(),
                       [&](const Value& member) { return _refer(_numberOf(member, depth + 1)); });
  }
  const Dictionary& dictionary = *value.asDictionary();
  for (const Dictionary::Entry& entry : dictionary) {
    if (!_refer(_numberOfText(entry.key()))) return false;
  }
  return std::all_of(dictionary.begin(), dictionary.end(), [&](const Dictionary::Entry& entry) {
    return _refer(_numberOf(entry.value(), depth + 1));
  });
}

bool BinaryWriter::_refer(std::optional<Number> number) {
  if (number) _references.push_back(*number);
  return number.has_value();
}

// The number of `value`, which is a new one for a container. `depth` counts `value` if it is one.
std::optional<BinaryWriter::Number> BinaryWriter::_numberOf(const Value& value,
                                                            std::uint32_t depth) {
  switch (value.kind()) {
    case Kind::dictionary:
    case Kind::array:
      if (depth > kMaximumDepth) return std::nullopt;
      return _add({&value, nullptr, 0, depth});
    case Kind::string:
      return _numberOfText(*value.asString());
    case Kind::data:
      return _numberOfData(*value.asData(), value);
    default:
      return _numberOfScalar(value);
  }
}

// A text that stands where one stood before is the same, and is not looked at: most keys, and much
// of what accounts have in common.
std::optional<BinaryWriter::Number> BinaryWriter::_numberOfText(const Text& text) {
  const auto address = reinterpret_cast<std::uintptr_t>(&text);
  Recent& recent = _recent[(address >> 4U ^ address >> 14U) & (kRecent - 1)];
  if (recent.text == &text) return recent.number;
  const std::optional<Number> number = _numberOfNewText(text);
  if (number) recent = {&text, *number};
  return number;
}

std::optional<BinaryWriter::Number> BinaryWriter::_numberOfNewText(const Text& text) {
  if (text.size() > kShort) {
    const auto known = _byAddress.find(&text);
    if (known != _byAddress.end()) return known->second;
  }
  const std::uint64_t hash = TextTable::hashOf(text);
  std::size_t known =
      _texts.find(hash, [&](std::size_t number) { return *_objects[number].text == text; });
  if (known == TextTable::kNone) {
    if (findInvalidUTF8(text)) return std::nullopt;
    known = _add({nullptr, &text});
    _texts.add(hash, known);
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
      hash, [&](std::size_t number) { return *_objects[number].value->asData() == data; });
  if (known == TextTable::kNone) {
    known = _add({&value, nullptr});
    _datas.add(hash, known);
  }
  if (data.size() > kShort) _byAddress.emplace(&data, static_cast<Number>(known));
  return static_cast<Number>(known);
}

std::optional<BinaryWriter::Number> BinaryWriter::_numberOfScalar(const Value& value) {
  std::uint64_t bits = 0;
  bool isNegative = false;
  if (const auto real = value.asReal()) {
    bits = std::bit_cast<std::uint64_t>(*real);
  } else if (const auto date = value.asDate()) {
    if (!std::isfinite(date->secondsSince2001)) return std::nullopt;
    bits = std::bit_cast<std::uint64_t>(date->secondsSince2001);
  } else if (const auto boolean = value.asBoolean()) {
    bits = *boolean ? 1 : 0;
  } else if (const auto positive = value.asUnsigned()) {
    bits = *positive;
  } else {
    bits = static_cast<std::uint64_t>(*value.asInteger());
    isNegative = true;  // tells it from a large one
  }
  const std::uint64_t hash =
      TextTable::hashOf(bits, static_cast<std::uint64_t>(value.kind()) * 2 + (isNegative ? 1 : 0));
  std::size_t known =
      _scalars.find(hash, [&](std::size_t number) { return *_objects[number].value == value; });
  if (known == TextTable::kNone) {
    known = _add({&value, nullptr});
    _scalars.add(hash, known);
  }
  return static_cast<Number>(known);
}

BinaryWriter::Number BinaryWriter::_add(const Object& object) {
  _objects.push_back(object);
  return static_cast<Number>(_objects.size() - 1);
}

// Putting

void BinaryWriter::_put(const Object& object) {
  if (object.text != nullptr) return _putText(*object.text);
  const Value& value = *object.value;
  switch (value.kind()) {
    case Kind::dictionary:
      _putHead(kDictionary, sizeOf(value));
      return _putReferences(object, sizeOf(value) * 2);
    case Kind::array:
      _putHead(kArray, sizeOf(value));
      return _putReferences(object, sizeOf(value));
    case Kind::string:  // has a text
      return;
    case Kind::integer:
      return _putInteger(value);
    case Kind::real:
      _putNumber(kReal | 3U, 1);
      return _putNumber(std::bit_cast<std::uint64_t>(*value.asReal()), 8);
    case Kind::boolean:
      return _putNumber(*value.asBoolean() ? kTrue : kFalse, 1);
    case Kind::date:
      _putNumber(kDate, 1);
      return _putNumber(std::bit_cast<std::uint64_t>(value.asDate()->secondsSince2001), 8);
    case Kind::data:
      _putHead(kData, value.asData()->size());
      return _putBytes(value.asData()->data(), value.asData()->size());
  }
}

// ASCII where that is enough, else UTF-16.
void BinaryWriter::_putText(std::string_view text) {
  if (isASCII(text)) {
    _putHead(kASCII, text.size());
    return _putBytes(text.data(), text.size());
  }
  std::vector<std::uint16_t> units;
  units.reserve(text.size());
  for (std::size_t position = 0; position < text.size();) {
    const char32_t codePoint = *decodeUTF8(text, position);
    if (codePoint < 0x10000) {
      units.push_back(static_cast<std::uint16_t>(codePoint));
    } else {
      units.push_back(static_cast<std::uint16_t>(0xD800 + ((codePoint - 0x10000) >> 10U)));
      units.push_back(static_cast<std::uint16_t>(0xDC00 + ((codePoint - 0x10000) & 0x3FFU)));
    }
  }
  _putHead(kUTF16, units.size());
  for (const std::uint16_t unit : units) _putNumber(unit, 2);
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
  for (const std::uint64_t offset : _offsets) {
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
