#include "propertylist/BinaryWriter.h"

#include <algorithm>
#include <bit>
#include <cmath>

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

// The sizes that offsets and references come in.
std::size_t sizeFor(std::uint64_t largest) {
  if (largest <= 0xFF) return 1;
  if (largest <= 0xFFFF) return 2;
  return largest <= 0xFFFFFFFF ? 4 : 8;
}

bool isASCII(std::string_view text) {
  return std::all_of(text.begin(), text.end(),
                     [](char c) { return static_cast<unsigned char>(c) < 0x80; });
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
  _bytes.assign(kMagic.begin(), kMagic.end());
  for (const Object& object : _objects) {
    _offsets.push_back(_bytes.size());
    _put(object);
    if (_bytes.size() > kMaximumFileSize) return std::nullopt;
  }
  _putOffsetsAndTrailer();
  if (_bytes.size() > kMaximumFileSize) return std::nullopt;
  return std::move(_bytes);
}

// Numbering

bool BinaryWriter::_number() {
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
  const std::size_t depth = _objects[container].depth;
  _objects[container].firstReference = _references.size();
  const auto refer = [this](std::optional<Number> number) {
    if (number) _references.push_back(*number);
    return number.has_value();
  };
  if (const Array* const array = value.asArray()) {
    return std::all_of(array->begin(), array->end(),
                       [&](const Value& member) { return refer(_numberOf(member, depth + 1)); });
  }
  const Dictionary& dictionary = *value.asDictionary();
  for (const Dictionary::Entry& entry : dictionary) {
    if (!refer(_numberOfText(entry.key()))) return false;
  }
  return std::all_of(dictionary.begin(), dictionary.end(), [&](const Dictionary::Entry& entry) {
    return refer(_numberOf(entry.value(), depth + 1));
  });
}

// The number of `value`, which is a new one for a container. `depth` counts `value` if it is one.
std::optional<BinaryWriter::Number> BinaryWriter::_numberOf(const Value& value, std::size_t depth) {
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

std::optional<BinaryWriter::Number> BinaryWriter::_numberOfText(const std::string& text) {
  if (text.size() > kShort) {
    const auto known = _byAddress.find(&text);
    if (known != _byAddress.end()) return known->second;
  }
  auto known = _texts.find(text);
  if (known == _texts.end()) {
    if (findInvalidUTF8(text)) return std::nullopt;
    known = _texts.emplace(text, _add({nullptr, &text})).first;
  }
  if (text.size() > kShort) _byAddress.emplace(&text, known->second);
  return known->second;
}

BinaryWriter::Number BinaryWriter::_numberOfData(const Bytes& data, const Value& value) {
  if (data.size() > kShort) {
    const auto known = _byAddress.find(&data);
    if (known != _byAddress.end()) return known->second;
  }
  auto known = _datas.find(viewOf(data));
  if (known == _datas.end()) known = _datas.emplace(viewOf(data), _add({&value, nullptr})).first;
  if (data.size() > kShort) _byAddress.emplace(&data, known->second);
  return known->second;
}

std::optional<BinaryWriter::Number> BinaryWriter::_numberOfScalar(const Value& value) {
  Scalar scalar{value.kind(), 0, false};
  if (const auto real = value.asReal()) {
    scalar.bits = std::bit_cast<std::uint64_t>(*real);
  } else if (const auto date = value.asDate()) {
    if (!std::isfinite(date->secondsSince2001)) return std::nullopt;
    scalar.bits = std::bit_cast<std::uint64_t>(date->secondsSince2001);
  } else if (const auto boolean = value.asBoolean()) {
    scalar.bits = *boolean ? 1 : 0;
  } else if (const auto positive = value.asUnsigned()) {
    scalar.bits = *positive;
  } else {
    scalar.bits = static_cast<std::uint64_t>(*value.asInteger());
    scalar.isNegative = true;
  }
  auto known = _scalars.find(scalar);
  if (known == _scalars.end()) known = _scalars.emplace(scalar, _add({&value, nullptr})).first;
  return known->second;
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
      _bytes.push_back(kReal | 3U);
      return _putNumber(std::bit_cast<std::uint64_t>(*value.asReal()), 8);
    case Kind::boolean:
      return _bytes.push_back(*value.asBoolean() ? kTrue : kFalse);
    case Kind::date:
      _bytes.push_back(kDate);
      return _putNumber(std::bit_cast<std::uint64_t>(value.asDate()->secondsSince2001), 8);
    case Kind::data:
      _putHead(kData, value.asData()->size());
      _bytes.insert(_bytes.end(), value.asData()->begin(), value.asData()->end());
      return;
  }
}

// ASCII where that is enough, else UTF-16.
void BinaryWriter::_putText(const std::string& text) {
  if (isASCII(text)) {
    _putHead(kASCII, text.size());
    _bytes.insert(_bytes.end(), text.begin(), text.end());
    return;
  }
  std::vector<std::uint16_t> units;
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
    _bytes.push_back(kInteger | 3U);
    return _putNumber(static_cast<std::uint64_t>(*negative), 8);
  }
  const std::uint64_t number = *integer.asUnsigned();
  if (number >> 63U == 0) return _putCount(number);
  _bytes.push_back(kInteger | 4U);
  _putNumber(0, 8);
  _putNumber(number, 8);
}

void BinaryWriter::_putReferences(const Object& container, std::size_t count) {
  for (std::size_t i = 0; i < count; ++i) {
    _putNumber(_references[container.firstReference + i], _referenceSize);
  }
}

void BinaryWriter::_putHead(std::uint8_t type, std::uint64_t count) {
  if (count < kLongCount) {
    _bytes.push_back(static_cast<std::uint8_t>(type | count));
    return;
  }
  _bytes.push_back(type | kLongCount);
  _putCount(count);
}

// An integer object of the smallest size; `count` is not above the signed range.
void BinaryWriter::_putCount(std::uint64_t count) {
  const std::size_t size = sizeFor(count);
  _bytes.push_back(static_cast<std::uint8_t>(kInteger | std::countr_zero(size)));
  _putNumber(count, size);
}

void BinaryWriter::_putNumber(std::uint64_t number, std::size_t size) {
  for (std::size_t i = size; i > 0; --i) {
    _bytes.push_back(static_cast<std::uint8_t>(number >> ((i - 1) * 8)));
  }
}

void BinaryWriter::_putOffsetsAndTrailer() {
  const std::uint64_t table = _bytes.size();
  const std::size_t offsetSize = sizeFor(_offsets.back());
  for (const std::uint64_t offset : _offsets) _putNumber(offset, offsetSize);
  _putNumber(0, kOffsetSizeAt);
  _putNumber(offsetSize, 1);
  _putNumber(_referenceSize, 1);
  _putNumber(_objects.size(), 8);
  _putNumber(0, 8);  // the top object
  _putNumber(table, 8);
}

}  // namespace propertylist
