// How the binary writer lays out what it has numbered.
#include <algorithm>
#include <bit>
#include <cstring>
#include <span>

#include "propertylist/BigEndian.h"
#include "propertylist/BinaryForm.h"
#include "propertylist/BinaryWriter.h"
#include "propertylist/UTF8.h"

namespace propertylist {

using namespace binary;

namespace {

std::size_t sizeOf(const Value& container) {
  const Array* const array = container.asArray();
  return array != nullptr ? array->size() : container.asDictionary()->size();
}

// Numbers of one size, the highest byte first.
template <typename Number>
void putNumbers(std::uint8_t* to, std::span<const std::uint32_t> numbers) {
  for (const std::uint32_t number : numbers) {
    const auto last = std::uint32_t{sizeof number} - sizeof(Number);
    const auto swapped = static_cast<Number>(__builtin_bswap32(number) >> 8 * last);
    std::memcpy(to, &swapped, sizeof swapped);
    to += sizeof swapped;
  }
}

// `size` is 1, 2 or 4.
void putAll(std::uint8_t* to, std::span<const std::uint32_t> numbers, std::size_t size) {
  if (size == 1) return putNumbers<std::uint8_t>(to, numbers);
  if (size == 2) return putNumbers<std::uint16_t>(to, numbers);
  putNumbers<std::uint32_t>(to, numbers);
}

// In words, of which the last one may begin in the one before. False, with whatever copied, when it
// is not ASCII.
bool copyASCII(std::uint8_t* to, std::string_view text) {
  constexpr std::uint64_t kHighBits = 0x8080808080808080;
  std::uint64_t word = 0;
  std::uint64_t all = 0;
  const auto copy = [&](std::size_t at, std::size_t size) {
    std::memcpy(&word, text.data() + at, size);
    std::memcpy(to + at, &word, size);
    all |= word;
  };
  if (text.size() < sizeof word) {
    for (std::size_t at = 0; at < text.size(); ++at) copy(at, 1);
  } else {
    for (std::size_t at = 0; at + sizeof word <= text.size(); at += sizeof word)
      copy(at, sizeof word);
    copy(text.size() - sizeof word, sizeof word);
  }
  return (all & kHighBits) == 0;
}

}  // namespace

// False for a text that is not UTF-8.
bool BinaryWriter::_put(const Object& object) {
  if (object.isText()) return _putText(object.text());
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

// ASCII where that is enough, which shows when it has been copied; else UTF-16.
bool BinaryWriter::_putText(std::string_view text) {
  const std::size_t begin = _end();
  _putHead(kASCII, text.size());
  if (copyASCII(_room(text.size()), text)) return true;
  _giveBack(_end() - begin);
  return _putWideText(text);
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
  putAll(_room(count * _referenceSize), {_references.data() + container.firstReference, count},
         _referenceSize);
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

// At least so many bytes of room, and twice as many in all as before.
void BinaryWriter::_makeMoreRoom(std::size_t size) {
  const std::size_t end = _end();
  _bytes.resize(std::max(_bytes.size() * 2, end + size));
  _next = _bytes.data() + end;
  _left = _bytes.size() - end;
}

void BinaryWriter::_putOffsetsAndTrailer() {
  const std::uint64_t table = _end();
  const std::size_t offsetSize = sizeFor(_offsets.back());
  putAll(_room(_offsets.size() * offsetSize), _offsets, offsetSize);
  _putNumber(0, kOffsetSizeAt);
  _putNumber(offsetSize, 1);
  _putNumber(_referenceSize, 1);
  _putNumber(_objects.size(), 8);
  _putNumber(0, 8);  // the top object
  _putNumber(table, 8);
}

}  // namespace propertylist
