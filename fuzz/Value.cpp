// The input is a recipe of a value, with parts that are shared or equal: what is written is read
// back equal; and, tried on one of four inputs, sharing does not change what is written. One of 32
// inputs may make a large value.
#include <algorithm>
#include <bit>
#include <cmath>
#include <vector>

#include "fuzz/Share.h"
#include "fuzz/WrittenLists.h"

namespace {

using namespace propertylist;

// Makes values of the input's bytes; of what is missing the bytes are zero.
class Recipe {
 public:
  // `mostMade` values at most, what is shared counted everywhere.
  Recipe(const std::uint8_t* data, std::size_t size, std::size_t mostMade)
      : _next(data), _end(data + size), _mostMade(mostMade) {}

  // A stack of values on which the bytes work like instructions; the topmost one is the result.
  Value make() {
    while (_next != _end && _stack.size() < kMaximumStack && _made < _mostMade) _step();
    return _stack.empty() ? Value(Dictionary()) : _stack.back();
  }

 private:
  static constexpr std::size_t kMaximumStack = 300;

  std::uint8_t _byte() { return _next == _end ? std::uint8_t{0} : *_next++; }

  std::uint64_t _bits() {
    std::uint64_t bits = 0;
    for (int i = 0; i < 8; ++i) bits = bits << 8U | _byte();
    return bits;
  }

  std::string _text() {
    std::string text;
    for (std::size_t length = _byte() % 24; length > 0; --length) {
      const std::uint8_t byte = _byte();
      if (byte < 0xE0) {
        text += static_cast<char>(byte & 0x7FU);
      } else {
        text += byte < 0xF0 ? "\xC3\xA4" : "\xF0\x9F\x98\x80";
      }
    }
    return text;
  }

  Value _pop() {
    if (_stack.empty()) return Dictionary();
    Value value = std::move(_stack.back());
    _stack.pop_back();
    return value;
  }

  void _step() {
    const std::uint8_t instruction = _byte() % 10;
    if (instruction == 9) {  // the topmost once more, so that it is shared
      if (!_stack.empty()) _stack.push_back(_stack.back());
      _made *= 2;
    } else {
      _stack.push_back(_value(instruction));
      ++_made;
    }
  }

  Value _value(std::uint8_t kind) {
    switch (kind) {
      case 0: {
        const std::uint64_t bits = _bits();
        return bits >> (_byte() % 64U);
      }
      case 1:
        return static_cast<std::int64_t>(_bits());
      case 2:
        return std::bit_cast<double>(_bits());
      case 3:
        return _byte() % 2 == 0;
      case 4: {
        const double seconds = std::bit_cast<double>(_bits());
        return Date{std::isfinite(seconds) ? seconds : 0};
      }
      case 5: {
        const std::size_t size = _byte() % 80U;
        return Bytes(size, _byte());
      }
      case 6:
        return _text();
      case 7:
        return _array();
      default:
        return _dictionary();
    }
  }

  Value _array() {
    Array array;
    for (std::size_t size = _byte() % 6; size > 0; --size) array.append(_pop());
    return array;
  }

  Value _dictionary() {
    Dictionary dictionary;
    for (std::size_t size = _byte() % 6; size > 0; --size) {
      const std::string key = _text();
      dictionary.set(key, _pop());
    }
    return dictionary;
  }

  const std::uint8_t* _next;
  const std::uint8_t* _end;
  const std::size_t _mostMade;
  std::vector<Value> _stack;
  std::size_t _made = 0;
};

std::size_t depthOf(const Value& value) {
  std::size_t depth = 0;
  if (const Array* const array = value.asArray()) {
    for (const Value& member : *array) depth = std::max(depth, depthOf(member));
    return depth + 1;
  }
  if (const Dictionary* const dictionary = value.asDictionary()) {
    for (const auto& entry : *dictionary) depth = std::max(depth, depthOf(entry.value()));
    return depth + 1;
  }
  return 0;
}

// The same value without a shared part.
Value unshared(const Value& value) {
  if (const Array* const array = value.asArray()) {
    Array copy;
    for (const Value& member : *array) copy.append(unshared(member));
    return copy;
  }
  if (const Dictionary* const dictionary = value.asDictionary()) {
    Dictionary copy;
    for (const auto& entry : *dictionary) copy.set(entry.key(), unshared(entry.value()));
    return copy;
  }
  if (const propertylist::Text* const text = value.asString()) return std::string(*text);
  if (const Bytes* const data = value.asData()) return Bytes(*data);
  return value;
}

void checkWithoutSharing(const Value& value) {
  const Value copy = unshared(value);
  FUZZ_CHECK(value == copy);
  FUZZ_CHECK(describe(value) == describe(copy));
  FUZZ_CHECK(writeXMLPropertyList(value) == writeXMLPropertyList(copy));
  FUZZ_CHECK(writeBinaryPropertyList(value) == writeBinaryPropertyList(copy));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const bool isLarge = fuzz::isOneOf(32, {data, size});
  const Value value = Recipe(data, size, isLarge ? 600 : 40).make();
  if (fuzz::isOneOf(4, {data, size})) checkWithoutSharing(value);
  if (depthOf(value) > kMaximumDepth) {
    FUZZ_CHECK(!writeBinaryPropertyList(value).has_value());
    return 0;
  }
  fuzz::checkBinaryForm(value);
  const std::optional<std::string> xml = writeXMLPropertyList(value);
  if (!xml) return 0;
  const ReadResult result = readXMLPropertyList(fuzz::bytesOf(*xml));
  FUZZ_CHECK(result.value.has_value());
  // Parts of a second are lost in this form. Where none were, nothing is left to be tried.
  if (writeXMLPropertyList(*result.value) != xml) fuzz::checkXMLForm(*result.value);
  return 0;
}
