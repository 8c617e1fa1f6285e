#pragma once

#include <bit>
#include <compare>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

#include "propertylist/Export.h"
#include "propertylist/Storage.h"

namespace propertylist {

class Arena;
class Value;

// The eight kinds of value that a property list holds.
enum class Kind : std::uint8_t { dictionary, array, string, integer, real, boolean, date, data };

// An instant, in seconds since 2001-01-01 00:00:00 UTC. Compared bit by bit, so that a date always
// equals itself, whatever its seconds are.
struct Date {
  double secondsSince2001 = 0;
  friend bool operator==(Date a, Date b) {
    return std::bit_cast<std::uint64_t>(a.secondsSince2001) ==
           std::bit_cast<std::uint64_t>(b.secondsSince2001);
  }
};

using Bytes = std::vector<std::uint8_t>;

// The text of a string or key, in UTF-8. Belongs to the value or entry that it was taken from.
class Text : public std::string_view {
 public:
  using std::string_view::string_view;
  explicit Text(std::string_view text) : std::string_view(text) {}
  operator std::string() const {  // NOLINT(google-explicit-constructor): a copy of one's own
    return std::string(data(), size());
  }
};

// What arrays, dictionaries, texts and data have in common: a counted reference to a node, or null.
class PROPERTYLIST_EXPORT Reference {
 public:
  Reference() = default;
  Reference(const Reference& other) noexcept : _bits(other._bits) {
    if (_bits != 0) _retain();
  }
  Reference(Reference&& other) noexcept : _bits(std::exchange(other._bits, 0)) {}
  Reference& operator=(const Reference& other) noexcept {
    Reference copy(other);  // first, because `other` may live inside of what this refers to
    std::swap(_bits, copy._bits);
    return *this;
  }
  Reference& operator=(Reference&& other) noexcept {
    Reference taken(std::move(other));
    std::swap(_bits, taken._bits);
    return *this;
  }
  ~Reference() {
    if (_bits != 0) _release();
  }

 protected:
  // Takes over one count of the node's.
  explicit Reference(const storage::Node* node) noexcept : _bits(storage::bitsOf(node)) {}
  storage::Node* _node() const noexcept { return storage::nodeOf(_bits); }
  std::uint64_t _bits = 0;  // the node's address

 private:
  friend class Value;
  friend class Dictionary;
  friend class Arena;
  void _retain() const noexcept { _node()->owner->retain(); }
  void _release() const noexcept { _node()->owner->release(); }
};

// An ordered list of values. A copy shares the storage; a change copies it first when somebody else
// shares it. One thread at a time may change an object; copies of it may be used by other threads.
class PROPERTYLIST_EXPORT Array : private Reference {
 public:
  Array() = default;
  // An array of one array is Array{Value(inner)}: some compilers take Array{inner} for a copy.
  Array(std::initializer_list<Value> values);
  explicit Array(std::vector<Value> values);

  std::size_t size() const;
  bool empty() const { return size() == 0; }
  // `index` is less than size().
  const Value& operator[](std::size_t index) const;
  const Value* begin() const;
  const Value* end() const;
  // Whether some member equals `value`.
  bool contains(const Value& value) const;

  void append(Value value);
  // `index` is less than size().
  void replace(std::size_t index, Value value);
  // `index` is less than size().
  void removeAt(std::size_t index);

  // Whether both are views of one storage, which makes them equal without a comparison.
  bool sharesStorageWith(const Array& other) const { return _bits == other._bits; }
  // Deep equality, strict by kind (see Value).
  PROPERTYLIST_EXPORT friend bool operator==(const Array& a, const Array& b);

 private:
  friend class Value;
  friend class Arena;
  struct Node;
  struct OwnNode;
  using Reference::Reference;
  const Node* _array() const;
  OwnNode& _mutable();
};

// Values by string key. Kept, visited and written in ascending order of the keys' UTF-8 bytes, so
// that equal dictionaries are visited alike. Shares storage like Array.
class PROPERTYLIST_EXPORT Dictionary : private Reference {
 public:
  // One key with its value. Keys read from one file share their text.
  class Entry;

  Dictionary() = default;
  // A key given twice keeps its last value.
  Dictionary(std::initializer_list<std::pair<std::string_view, Value>> entries);
  // Builds a dictionary of any size in one go. A key given twice keeps its last value.
  explicit Dictionary(std::vector<Entry> entries);

  std::size_t size() const;
  bool empty() const { return size() == 0; }
  // The value under `key`, or null. Valid until this dictionary changes.
  const Value* find(std::string_view key) const;
  bool contains(std::string_view key) const { return find(key) != nullptr; }
  // Entries in ascending order of their keys.
  const Entry* begin() const;
  const Entry* end() const;

  // Puts `value` under `key`, in place of what is there.
  void set(std::string_view key, Value value);
  // Removes `key`; false when it was not there.
  bool remove(std::string_view key);

  bool sharesStorageWith(const Dictionary& other) const { return _bits == other._bits; }
  PROPERTYLIST_EXPORT friend bool operator==(const Dictionary& a, const Dictionary& b);

 private:
  friend class Value;
  friend class Arena;
  struct Node;
  struct OwnNode;
  using Reference::Reference;
  const Node* _dictionary() const;
  const Entry* _lowerBound(std::string_view key) const;
  OwnNode& _mutable();
};

// One property-list value: a dictionary, array, string (UTF-8), integer (64 bits, signed or
// unsigned), real, boolean, date or data. There is no null value: absence is an empty optional or a
// null pointer.
//
// Copies share their storage, so a deep copy costs a reference count. The values that were read
// from one file share one storage, which goes when the last copy of any of them has gone; what is
// changed has storage of its own. Equality is deep and strict
// by kind: integer 1, real 1.0 and boolean true differ from one another; reals compare bit by bit.
// A signed and an unsigned integer of equal value are equal.
//
// A value that was moved from is an empty dictionary. However deep a value is nested, copying,
// comparing and destroying it use a bounded stack.
class PROPERTYLIST_EXPORT Value {
 public:
  Value(Dictionary dictionary);    // NOLINT(google-explicit-constructor): literals read as values
  Value(Array array);              // NOLINT(google-explicit-constructor)
  Value(std::string string);       // NOLINT(google-explicit-constructor)
  Value(std::string_view string);  // NOLINT(google-explicit-constructor)
  Value(const char* string);       // NOLINT(google-explicit-constructor)
  // A string that shares `string`, which is not null, with other values.
  explicit Value(std::shared_ptr<const std::string> string);
  Value(Date date);   // NOLINT(google-explicit-constructor)
  Value(Bytes data);  // NOLINT(google-explicit-constructor)
  template <typename T>
  requires std::same_as<T, bool> Value(T boolean);  // NOLINT(google-explicit-constructor)
  template <typename T>
  requires(std::integral<T> && !std::same_as<T, bool> && !std::same_as<T, char>)
      Value(T integer);  // NOLINT(google-explicit-constructor)
  template <std::floating_point T>
  Value(T real);  // NOLINT(google-explicit-constructor)

  Value(const Value& other) noexcept;
  Value(Value&& other) noexcept;
  Value& operator=(const Value& other) noexcept;
  Value& operator=(Value&& other) noexcept;
  ~Value() {
    if (_hasNode()) _content.reference.~Reference();
  }

  Kind kind() const { return _isNegative() ? Kind::integer : _tag(); }

  // What the value holds when it is of that kind, else null or empty. Pointers are valid until the
  // value changes.
  const Dictionary* asDictionary() const;
  const Array* asArray() const;
  const Text* asString() const;
  // Empty also for an integer above the signed range.
  std::optional<std::int64_t> asInteger() const;
  // Empty also for a negative integer.
  std::optional<std::uint64_t> asUnsigned() const;
  std::optional<double> asReal() const;
  std::optional<bool> asBoolean() const;
  std::optional<Date> asDate() const;
  const Bytes* asData() const;

  PROPERTYLIST_EXPORT friend bool operator==(const Value& a, const Value& b);

 private:
  friend class Array;
  friend class Dictionary;
  friend class Arena;
  friend class BinaryWriter;
  class Comparison;
  class Counting;
  friend std::uint64_t countValues(const Value& value, std::uint64_t limit);
  struct TextNode;
  struct OwnTextNode;
  struct SharedTextNode;
  struct DataNode;
  struct OwnDataNode;
  struct NodeTag {};

  // The kind, but Kind::boolean for an integer below zero: its highest bit tells it from booleans.
  using Tag = Kind;
  static constexpr std::uint64_t kTagBits = 7;

  // Takes over one count of the node's, which is one of this kind; or, for a value that lies in an
  // arena and is never destroyed, none.
  Value(NodeTag /*tag*/, Kind kind, storage::Node* node) noexcept
      : _keyAndTag(static_cast<std::uint64_t>(kind)), _content(Reference(node)) {}
  Value(Tag tag, std::uint64_t bits) noexcept
      : _keyAndTag(static_cast<std::uint64_t>(tag)), _content(bits) {}
  static storage::Node* _newText(std::string_view text);
  Tag _tag() const { return static_cast<Tag>(_keyAndTag & kTagBits); }
  storage::Node* _key() const { return storage::nodeOf(_keyAndTag & ~kTagBits); }
  bool _isNegative() const { return _tag() == Kind::boolean && _content.bits >> 63U != 0; }
  bool _hasNode() const {
    const Tag tag = _tag();
    return tag == Kind::dictionary || tag == Kind::array || tag == Kind::string ||
           tag == Kind::data;
  }
  const TextNode& _textNode() const;
  const DataNode& _dataNode() const;

  // Numbers, booleans and dates by their bits; everything else by reference.
  union Content {
    explicit Content(std::uint64_t b) : bits(b) {}
    explicit Content(Reference r) : reference(std::move(r)) {}
    ~Content() {}  // NOLINT(modernize-use-equals-default): the value knows what there is
    std::uint64_t bits;
    Reference reference;
    Dictionary dictionary;
    Array array;
  };
  // The tag, and above it the address of its entry's key when it is the value of an entry: nodes
  // lie at multiples of eight. So an entry takes two words, not three. Copies have no key, and what
  // is assigned to a value leaves its key alone.
  std::uint64_t _keyAndTag;
  Content _content;
};

class PROPERTYLIST_EXPORT Dictionary::Entry {
 public:
  Entry(std::string_view key, Value value);
  Entry(const Entry& other) noexcept;
  Entry(Entry&& other) noexcept;
  Entry& operator=(const Entry& other) noexcept;
  Entry& operator=(Entry&& other) noexcept;
  ~Entry();

  const Text& key() const;
  const Value& value() const { return _value; }

 private:
  friend class Dictionary;
  friend class Value;
  friend class Arena;
  void _setKey(std::uint64_t node) { _value._keyAndTag |= node; }
  std::uint64_t _keyBits() const { return _value._keyAndTag & ~Value::kTagBits; }
  Value _value;  // which carries the key, a counted text; none after the entry was moved from
};

inline Value::Value(const Value& other) noexcept
    : _keyAndTag(other._keyAndTag & kTagBits), _content(std::uint64_t{0}) {
  if (_hasNode()) {
    new (&_content.reference) Reference(other._content.reference);
  } else {
    _content.bits = other._content.bits;
  }
}

// A value that was moved from is an empty dictionary, so that a string always has a text.
inline Value::Value(Value&& other) noexcept
    : _keyAndTag(other._keyAndTag & kTagBits), _content(std::uint64_t{0}) {
  if (_hasNode()) {
    new (&_content.reference) Reference(std::move(other._content.reference));
  } else {
    _content.bits = other._content.bits;
    new (&other._content.reference) Reference();
  }
  static_assert(Kind::dictionary == Kind{0});
  other._keyAndTag &= ~kTagBits;
}

template <typename T>
requires std::same_as<T, bool> Value::Value(T boolean) : Value(Kind::boolean, boolean ? 1U : 0U) {}

template <typename T>
requires(std::integral<T> && !std::same_as<T, bool> &&
         !std::same_as<T, char>) Value::Value(T integer)
    : Value(std::cmp_less(integer, 0) ? Kind::boolean : Kind::integer,
            static_cast<std::uint64_t>(integer)) {}

template <std::floating_point T>
Value::Value(T real) : Value(Kind::real, std::bit_cast<std::uint64_t>(static_cast<double>(real))) {}

// The value under `key` when it is of the named kind, else null or empty: one step for the usual
// two.
PROPERTYLIST_EXPORT const Text* findString(const Dictionary& dictionary, std::string_view key);
PROPERTYLIST_EXPORT const Array* findArray(const Dictionary& dictionary, std::string_view key);
PROPERTYLIST_EXPORT const Dictionary* findDictionary(const Dictionary& dictionary,
                                                     std::string_view key);
PROPERTYLIST_EXPORT std::optional<bool> findBoolean(const Dictionary& dictionary,
                                                    std::string_view key);

}  // namespace propertylist

#include "propertylist/Nodes.h"
