// The second pass of the binary reader: what was checked becomes values.
#include <algorithm>
#include <bit>
#include <string_view>

#include "propertylist/BinaryForm.h"
#include "propertylist/BinaryReader.h"
#include "propertylist/UTF8.h"

namespace propertylist {

using namespace binary;

// Numbers the texts of all keys in their order. Dictionaries are then sorted by these numbers:
// sorting each by its texts could cost far more than the size of the file when many share a few
// long keys.
void BinaryReader::_rankKeys() {
  for (const std::uint32_t key : _keys) _build(_objects[key]);
  const auto textOf = [this](std::uint32_t key) -> const std::string& {
    return *_objects[key].value->asString();
  };
  std::sort(_keys.begin(), _keys.end(),
            [&](std::uint32_t a, std::uint32_t b) { return textOf(a) < textOf(b); });
  for (std::size_t i = 1; i < _keys.size(); ++i) {
    const std::uint32_t previous = _objects[_keys[i - 1]].keyRank;
    const bool isSame = textOf(_keys[i]) == textOf(_keys[i - 1]);
    _objects[_keys[i]].keyRank = isSame ? previous : previous + 1;
  }
}

void BinaryReader::_build(Object& object) {
  if (object.value) return;
  const Header& header = object.header;
  if (header.marker == kArray) {
    object.value = _array(header);
  } else if (header.marker == kDictionary) {
    object.value = _dictionary(header);
  } else {
    object.value = _leaf(header);
  }
}

Value BinaryReader::_leaf(const Header& header) const {
  const auto bits = [&](std::size_t size) { return _number(header.contents, size); };
  switch (header.marker) {
    case kFalse:
      return false;
    case kTrue:
      return true;
    case kInteger | 0U:
      return bits(1);
    case kInteger | 1U:
      return bits(2);
    case kInteger | 2U:
      return bits(4);
    case kInteger | 3U:
      return static_cast<std::int64_t>(bits(8));
    case kInteger | 4U: {
      const std::uint64_t low = _number(header.contents + 8, 8);
      return bits(8) == 0 ? Value(low) : Value(static_cast<std::int64_t>(low));
    }
    case kReal | 2U:
      return std::bit_cast<float>(static_cast<std::uint32_t>(bits(4)));
    case kReal | 3U:
      return std::bit_cast<double>(bits(8));
    case kDate:
      return Date{std::bit_cast<double>(bits(8))};
    case kData: {
      const auto data = _bytes.subspan(header.contents, static_cast<std::size_t>(header.count));
      return Bytes(data.begin(), data.end());
    }
    default:
      return _text(header);
  }
}

std::string BinaryReader::_text(const Header& header) const {
  std::string text;
  const auto count = static_cast<std::size_t>(header.count);
  if (header.marker == kASCII) {
    const auto ascii = _bytes.subspan(header.contents, count);
    text.assign(ascii.begin(), ascii.end());
    return text;
  }
  text.reserve(count);
  for (std::size_t i = 0; i < count; ++i) {
    auto unit = static_cast<char32_t>(_number(header.contents + i * 2, 2));
    if (unit >= 0xD800 && unit <= 0xDBFF) {  // the other half follows
      ++i;
      const auto low = static_cast<char32_t>(_number(header.contents + i * 2, 2));
      unit = 0x10000 + ((unit - 0xD800) << 10U) + (low - 0xDC00);
    }
    appendUTF8(text, unit);
  }
  return text;
}

Value BinaryReader::_array(const Header& header) const {
  std::vector<Value> values;
  values.reserve(static_cast<std::size_t>(header.count));
  for (std::uint64_t i = 0; i < header.count; ++i) values.push_back(*_member(header, i).value);
  return Array(std::move(values));
}

Value BinaryReader::_dictionary(const Header& header) const {
  struct Pair {
    std::uint32_t keyRank;
    const Object* key;
    const Object* value;
  };
  std::vector<Pair> pairs;
  pairs.reserve(static_cast<std::size_t>(header.count));
  for (std::uint64_t i = 0; i < header.count; ++i) {
    const Object& key = _member(header, i);
    pairs.push_back({key.keyRank, &key, &_member(header, header.count + i)});
  }
  // Most files come sorted.
  const auto isBefore = [](const Pair& a, const Pair& b) { return a.keyRank < b.keyRank; };
  if (!std::is_sorted(pairs.begin(), pairs.end(), isBefore))
    std::stable_sort(pairs.begin(), pairs.end(), isBefore);
  std::vector<Dictionary::Entry> entries;
  entries.reserve(pairs.size());
  for (std::size_t i = 0; i < pairs.size(); ++i) {
    const bool comesAgain = i + 1 < pairs.size() && pairs[i].keyRank == pairs[i + 1].keyRank;
    if (!comesAgain) {
      entries.emplace_back(pairs[i].key->value->sharedString(), *pairs[i].value->value);
    }
  }
  return Dictionary::_fromAscending(std::move(entries));
}

// A reference that the first pass has followed.
const BinaryReader::Object& BinaryReader::_member(const Header& header, std::uint64_t index) const {
  const std::uint64_t number = _number(_placeOfReference(header, index), _referenceSize);
  return _objects[_objectOfNumber[static_cast<std::size_t>(number)] - 1];
}

}  // namespace propertylist
