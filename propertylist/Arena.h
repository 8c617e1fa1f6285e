#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <deque>
#include <memory>
#include <new>
#include <span>
#include <string_view>
#include <vector>

#include "propertylist/Value.h"

namespace propertylist {

// The storage of one file's values while it is read, and then of all that is left of them: few
// large allocations instead of one for each node, which go together. What lies in it is never
// destroyed one by one, and what refers to it from inside is not counted.
class Arena final : public storage::Owner {
 public:
  // Holds the first reference.
  class Holder {
   public:
    explicit Holder(std::size_t expectedSize) : _arena(new Arena(expectedSize)) {}
    ~Holder() { _arena->release(); }
    Holder(const Holder&) = delete;
    Holder& operator=(const Holder&) = delete;
    Arena* operator->() const { return _arena; }

   private:
    Arena* _arena;
  };

  // A value as it lies in the arena: its bits, or its node.
  struct Raw {
    Kind kind = Kind::dictionary;  // or Kind::boolean for an integer below zero, as in Value
    std::uint64_t bits = 0;        // or the address of its node, 0 for an empty container

    storage::Node* node() const { return storage::nodeOf(bits); }
    void setNode(const storage::Node* node) { bits = storage::bitsOf(node); }
  };

  static Raw scalar(Kind kind, std::uint64_t bits);
  static Raw integer(std::uint64_t bits, bool isNegative);
  Raw newText(std::string_view text);
  // The text of `size` bytes, behind which eight more can be read. `isASCII` tells whether all are.
  Raw newASCII(const char* bytes, std::size_t size, bool& isASCII);
  Raw newData(std::span<const std::uint8_t> data);
  // Containers of members that are put in by their index, each once.
  Raw newArray(std::size_t size);
  Raw newDictionary(std::size_t size);
  static void put(const Raw& array, std::size_t index, const Raw& member);
  static void putKey(const Raw& dictionary, std::size_t index, const Raw& text);
  // After its key.
  static void putValue(const Raw& dictionary, std::size_t index, const Raw& value);
  static const Text& keyAt(const Raw& dictionary, std::size_t index);
  static std::size_t sizeOf(const Raw& dictionary);
  static const Text& textOf(const Raw& text);
  // That the file refers to the container once more.
  static void noteShared(const Raw& container);
  // Sorts by `isBefore(keyNode, keyNode)`, an order of texts. Of equal keys the last stays.
  template <typename IsBefore>
  static void sort(const Raw& dictionary, const IsBefore& isBefore);
  // The finished value for the world outside, counted.
  Value value(const Raw& raw);

 private:
  explicit Arena(std::size_t expectedSize);
  void* _allocate(std::size_t size);
  void* _allocateFromNewChunk(std::size_t size);
  void* _allocateChunk(std::size_t size);

  static Value* _membersOf(const Raw& array);
  static Dictionary::Entry* _entriesOf(const Raw& dictionary);
  static const Value::TextNode& _keyOf(const Dictionary::Entry& entry);

  static constexpr std::size_t kAlignment = alignof(std::uint64_t);
  std::size_t _chunkSize;
  std::byte* _next = nullptr;
  std::size_t _left = 0;
  std::vector<std::unique_ptr<std::byte[]>> _chunks;  // NOLINT(modernize-avoid-c-arrays)
  std::deque<Value::DataNode> _datas;                 // apart, because these have to be destroyed
};

inline void* Arena::_allocate(std::size_t size) {
  size = (size + kAlignment - 1) / kAlignment * kAlignment;
  if (size > _left) return _allocateFromNewChunk(size);
  void* const memory = _next;
  _next += size;
  _left -= size;
  return memory;
}

inline Arena::Raw Arena::scalar(Kind kind, std::uint64_t bits) {
  Raw raw;
  raw.kind = kind;
  raw.bits = bits;
  return raw;
}

inline Arena::Raw Arena::integer(std::uint64_t bits, bool isNegative) {
  return scalar(isNegative ? Kind::boolean : Kind::integer, bits);
}

inline Arena::Raw Arena::newText(std::string_view text) {
  auto* const memory = static_cast<char*>(_allocate(sizeof(Value::TextNode) + text.size()));
  char* const characters = memory + sizeof(Value::TextNode);
  if (!text.empty()) std::memcpy(characters, text.data(), text.size());
  Raw raw;
  raw.kind = Kind::string;
  raw.setNode(new (memory) Value::TextNode(this, {characters, text.size()}));
  return raw;
}

// In whole words: there is room for the last one, because memory is handed out in words.
inline Arena::Raw Arena::newASCII(const char* bytes, std::size_t size, bool& isASCII) {
  constexpr std::uint64_t kHighBits = 0x8080808080808080;
  auto* const memory = static_cast<char*>(_allocate(sizeof(Value::TextNode) + size));
  char* const characters = memory + sizeof(Value::TextNode);
  std::uint64_t word = 0;
  std::uint64_t all = 0;
  std::size_t at = 0;
  for (; at + sizeof word <= size; at += sizeof word) {
    std::memcpy(&word, bytes + at, sizeof word);
    std::memcpy(characters + at, &word, sizeof word);
    all |= word;
  }
  if (at < size) {
    std::memcpy(&word, bytes + at, sizeof word);
    std::memcpy(characters + at, &word, sizeof word);
    all |= word << 8 * (at + sizeof word - size);  // without what is behind the text
  }
  isASCII = (all & kHighBits) == 0;
  Raw raw;
  raw.kind = Kind::string;
  raw.setNode(new (memory) Value::TextNode(this, {characters, size}));
  return raw;
}

inline Value* Arena::_membersOf(const Raw& array) {
  return const_cast<Value*>(static_cast<Array::Node*>(array.node())->first);
}

inline Dictionary::Entry* Arena::_entriesOf(const Raw& dictionary) {
  return const_cast<Dictionary::Entry*>(static_cast<Dictionary::Node*>(dictionary.node())->first);
}

inline const Value::TextNode& Arena::_keyOf(const Dictionary::Entry& entry) {
  return *static_cast<const Value::TextNode*>(entry._value._key());
}

inline void Arena::put(const Raw& array, std::size_t index, const Raw& member) {
  new (_membersOf(array) + index) Value(member.kind, member.bits);
}

inline void Arena::putKey(const Raw& dictionary, std::size_t index, const Raw& text) {
  new (&_entriesOf(dictionary)[index]._value) Value(Kind::dictionary, 0);
  _entriesOf(dictionary)[index]._setKey(text.bits);
}

inline void Arena::putValue(const Raw& dictionary, std::size_t index, const Raw& value) {
  Value& place = _entriesOf(dictionary)[index]._value;
  place._keyAndTag |= static_cast<std::uint64_t>(value.kind);
  place._content.bits = value.bits;
}

inline const Text& Arena::keyAt(const Raw& dictionary, std::size_t index) {
  return _keyOf(_entriesOf(dictionary)[index]).text;
}

inline std::size_t Arena::sizeOf(const Raw& dictionary) {
  return dictionary.bits != 0 ? static_cast<Dictionary::Node*>(dictionary.node())->size : 0;
}

inline const Text& Arena::textOf(const Raw& text) {
  return static_cast<Value::TextNode*>(text.node())->text;
}

inline void Arena::noteShared(const Raw& container) {
  if (container.bits == 0) return;
  if (container.kind == Kind::array) static_cast<Array::Node*>(container.node())->isShared = true;
  if (container.kind == Kind::dictionary)
    static_cast<Dictionary::Node*>(container.node())->isShared = true;
}

template <typename IsBefore>
void Arena::sort(const Raw& dictionary, const IsBefore& isBefore) {
  auto& node = static_cast<Dictionary::Node&>(*dictionary.node());
  Dictionary::Entry* const first = _entriesOf(dictionary);
  std::stable_sort(first, first + node.size,
                   [&](const Dictionary::Entry& a, const Dictionary::Entry& b) {
                     return isBefore(_keyOf(a), _keyOf(b));
                   });
  std::size_t kept = 0;
  for (std::size_t i = 0; i < node.size; ++i) {
    const bool comesAgain = i + 1 < node.size && !isBefore(_keyOf(first[i]), _keyOf(first[i + 1]));
    if (comesAgain) continue;
    if (kept != i)
      std::memcpy(static_cast<void*>(first + kept), static_cast<const void*>(first + i),
                  sizeof *first);
    ++kept;
  }
  node.setSize(kept);
}

}  // namespace propertylist
