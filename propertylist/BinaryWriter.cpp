#include "propertylist/BinaryWriter.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>

#include "propertylist/BinaryForm.h"
#include "propertylist/Reading.h"
#include "propertylist/ValueCount.h"
#include "propertylist/Writing.h"

namespace propertylist {

using namespace binary;

namespace {

// Texts and data up to this size are found faster by content than by address and content.
constexpr std::size_t kShort = 64;
// From so many values on, the tables do not lie in the nearest caches.
constexpr std::uint64_t kMany = std::uint64_t{1} << 16U;
// Of how many texts the place in memory is remembered at most. A power of two.
constexpr std::size_t kMostRecent = 1024;

std::string_view viewOf(const Bytes& data) {
  return {reinterpret_cast<const char*>(data.data()), data.size()};
}

std::uint64_t hashOfAddress(const void* content) {
  return TextTable::hashOf(reinterpret_cast<std::uintptr_t>(content), 0);
}

bool isScalar(Kind kind) {
  return kind == Kind::integer || kind == Kind::real || kind == Kind::boolean || kind == Kind::date;
}

// What tells a scalar from all others: its number in bits, and its kind with the sign of an
// integer.
struct ScalarBits {
  explicit ScalarBits(const Value& value) : kind(static_cast<std::uint64_t>(value.kind()) * 2) {
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
      ++kind;
    }
  }
  std::uint64_t hash() const { return TextTable::hashOf(bits, kind); }
  bool operator==(const ScalarBits&) const = default;

  std::uint64_t bits = 0;
  std::uint64_t kind;
};

// The first members of a container with its node at that address, behind which they lie in an
// arena. Nothing happens where there is nothing.
void prefetchMembers(std::uint64_t address) {
  constexpr std::uint64_t kLine = 64;
  constexpr std::uint64_t kLines = 5;  // some eighteen entries
  for (std::uint64_t line = 0; line < kLines; ++line)
    __builtin_prefetch(storage::nodeOf(address + line * kLine));
}

}  // namespace

std::optional<Bytes> writeBinaryPropertyList(const Value& value) {
  return BinaryWriter(value).write();
}

std::optional<Bytes> BinaryWriter::write() {
  // Each value takes a byte at least, so a value of more would only be laid out to be refused.
  const std::uint64_t values = countValues(_value, kMaximumFileSize);
  if (values > kMaximumFileSize) return std::nullopt;
  _hasMany = values > kMany;
  _makeRoomFor(static_cast<std::size_t>(values));
  if (!_number()) return std::nullopt;
  _referenceSize = sizeFor(_objects.size() - 1);
  if (_references.size() * _referenceSize > kMaximumFileSize) return std::nullopt;
  _bytes.resize(_expectedSize());
  _next = _bytes.data();
  _left = _bytes.size();
  _putBytes(kMagic.data(), kMagic.size());
  _offsets.reserve(_objects.size());
  for (std::size_t i = 0; i < _objects.size(); ++i) {
    constexpr std::size_t kAhead = 48;
    if (i + kAhead < _objects.size()) __builtin_prefetch(_objects[i + kAhead].place());
    _offsets.push_back(static_cast<std::uint32_t>(_end()));
    if (!_put(_objects[i]) || _end() > kMaximumFileSize) return std::nullopt;
  }
  _putOffsetsAndTrailer();
  if (_end() > kMaximumFileSize) return std::nullopt;
  _bytes.resize(_end());
  return std::move(_bytes);
}

// For what most files of so many values need.
void BinaryWriter::_makeRoomFor(std::size_t values) {
  constexpr std::size_t kMost = std::size_t{1} << 22U;
  const std::size_t expected = std::min(values, kMost);
  _objects.reserve(expected);
  _references.reserve(2 * expected);
  _texts.makeRoomFor(expected / 5);
  _scalars.makeRoomFor(expected / 20);
  _datas.makeRoomFor(expected / 40);
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
  if (_numberOf(_value, 1) == kNoNumber) return false;
  constexpr std::size_t kAhead = 4;
  for (std::size_t i = 0; i < _objects.size(); ++i) {
    if (i + kAhead < _objects.size() && _objects[i + kAhead].depth > 0)
      prefetchMembers(_objects[i + kAhead].value()._content.bits);
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

// Where there are many values, hashes some before it looks the first one up: each is somewhere else
// in memory, and comes from there while the next ones are hashed.
template <typename Members, typename ValueOf>
bool BinaryWriter::_referToValues(const Members& members, std::uint32_t depth,
                                  const ValueOf& valueOf) {
  constexpr std::ptrdiff_t kAhead = 32;
  std::array<std::uint64_t, kAhead> hashes;
  for (auto from = members.begin(); from != members.end();) {
    const auto to = from + std::min(kAhead, members.end() - from);
    std::transform(from, to, hashes.begin(),
                   [&](const auto& member) { return _hasMany ? _hashAhead(valueOf(member)) : 0; });
    for (auto hash = hashes.begin(); from != to; ++from, ++hash) {
      const Number number = _numberOf(valueOf(*from), depth, *hash);
      if (number == kNoNumber) return false;
      _references.push_back(number);
    }
  }
  return true;
}

// The hash of a text or scalar that has to be looked up by its content; else 0.
std::uint64_t BinaryWriter::_hashAhead(const Value& value) {
  if (const Text* const text = value.asString()) {
    if (text->size() > kShort || _recentAt(*text).text == text) return 0;
    const std::uint64_t hash = TextTable::hashOf(*text);
    _texts.prefetch(hash);
    return hash;
  }
  if (!isScalar(value.kind())) return 0;
  const std::uint64_t hash = ScalarBits(value).hash();
  _scalars.prefetch(hash);
  return hash;
}

// The number of `value`, which is a new one for a container; kNoNumber when it cannot be written.
// `depth` counts `value` if it is a container.
BinaryWriter::Number BinaryWriter::_numberOf(const Value& value, std::uint32_t depth,
                                             std::uint64_t hash) {
  switch (value.kind()) {
    case Kind::dictionary:
    case Kind::array:
      if (depth > kMaximumDepth) return kNoNumber;
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

BinaryWriter::Number BinaryWriter::_numberOfText(const Text& text, std::uint64_t hash) {
  Recent& recent = _recentAt(text);
  if (recent.text != &text) recent = {&text, _numberOfNewText(text, hash)};
  return recent.number;
}

BinaryWriter::Number BinaryWriter::_numberOfNewText(const Text& text, std::uint64_t hash) {
  const bool isLong = text.size() > kShort;
  if (isLong) {
    const Number number = _numberAt(&text);
    if (number != kNoNumber) return number;
  }
  if (hash == 0) hash = TextTable::hashOf(text);
  std::size_t known =
      _texts.find(hash, [&](std::size_t number) { return _objects[number].text() == text; });
  if (known == TextTable::kNone) {
    known = _add(Object(text));
    _contentBytes += text.size();
    _texts.add(hash, known);
  }
  if (isLong) _remember(&text, static_cast<Number>(known));
  return static_cast<Number>(known);
}

BinaryWriter::Number BinaryWriter::_numberOfData(const Bytes& data, const Value& value) {
  const bool isLong = data.size() > kShort;
  if (isLong) {
    const Number number = _numberAt(&data);
    if (number != kNoNumber) return number;
  }
  const std::uint64_t hash = TextTable::hashOf(viewOf(data));
  std::size_t known = _datas.find(
      hash, [&](std::size_t number) { return *_objects[number].value().asData() == data; });
  if (known == TextTable::kNone) {
    known = _add(Object(value));
    _datas.add(hash, known);
    _contentBytes += data.size();
  }
  if (isLong) _remember(&data, static_cast<Number>(known));
  return static_cast<Number>(known);
}

BinaryWriter::Number BinaryWriter::_numberOfScalar(const Value& value, std::uint64_t hash) {
  if (const auto date = value.asDate(); date && !std::isfinite(date->secondsSince2001))
    return kNoNumber;
  const ScalarBits bits(value);
  if (hash == 0) hash = bits.hash();
  std::size_t known = _scalars.find(
      hash, [&](std::size_t number) { return ScalarBits(_objects[number].value()) == bits; });
  if (known == TextTable::kNone) {
    known = _add(Object(value));
    _scalars.add(hash, known);
  }
  return static_cast<Number>(known);
}

// The number of the long text or data that stands there; kNoNumber when it has not come yet.
BinaryWriter::Number BinaryWriter::_numberAt(const void* content) const {
  const std::size_t known = _placesByAddress.find(
      hashOfAddress(content), [&](std::size_t index) { return _places[index].content == content; });
  return known != TextTable::kNone ? _places[known].number : kNoNumber;
}

void BinaryWriter::_remember(const void* content, Number number) {
  _placesByAddress.add(hashOfAddress(content), _places.size());
  _places.push_back({content, number});
}

BinaryWriter::Number BinaryWriter::_add(const Object& object) {
  _objects.push_back(object);
  return static_cast<Number>(_objects.size() - 1);
}

}  // namespace propertylist
