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
#include <variant>
#include <vector>

#include "propertylist/Export.h"

namespace propertylist {

class BinaryReader;
class Value;

// The eight kinds of value that a property list holds.
enum class Kind { dictionary, array, string, integer, real, boolean, date, data };

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

// An ordered list of values. A copy shares the storage; a change copies it first when somebody else
// shares it. One thread at a time may change an object; copies of it may be used by other threads.
class PROPERTYLIST_EXPORT Array {
 public:
  Array();
  // An array of one array is Array{Value(inner)}: some compilers take Array{inner} for a copy.
  Array(std::initializer_list<Value> values);
  explicit Array(std::vector<Value> values);
  Array(const Array&);
  Array(Array&&) noexcept;
  Array& operator=(const Array&);
  Array& operator=(Array&&) noexcept;
  ~Array();

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
  bool sharesStorageWith(const Array& other) const { return _storage == other._storage; }
  // Deep equality, strict by kind (see Value).
  PROPERTYLIST_EXPORT friend bool operator==(const Array& a, const Array& b);

 private:
  friend class Value;
  struct Storage;
  std::vector<Value>& _mutable();
  std::shared_ptr<Storage> _storage;  // null for the empty array
};

// Values by string key. Kept, visited and written in ascending order of the keys' UTF-8 bytes, so
// that equal dictionaries are visited alike. Shares storage like Array.
class PROPERTYLIST_EXPORT Dictionary {
 public:
  // One key with its value. Keys read from one file share their text.
  class Entry;

  Dictionary();
  // A key given twice keeps its last value.
  Dictionary(std::initializer_list<std::pair<std::string_view, Value>> entries);
  // Builds a dictionary of any size in one go. A key given twice keeps its last value.
  explicit Dictionary(std::vector<Entry> entries);
  Dictionary(const Dictionary&);
  Dictionary(Dictionary&&) noexcept;
  Dictionary& operator=(const Dictionary&);
  Dictionary& operator=(Dictionary&&) noexcept;
  ~Dictionary();

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

  bool sharesStorageWith(const Dictionary& other) const { return _storage == other._storage; }
  PROPERTYLIST_EXPORT friend bool operator==(const Dictionary& a, const Dictionary& b);

 private:
  friend class Value;
  friend class BinaryReader;
  struct Storage;
  // Takes entries that are in ascending order of their keys already, each key once.
  static Dictionary _fromAscending(std::vector<Entry> entries);
  const Entry* _lowerBound(std::string_view key) const;
  std::vector<Entry>& _mutable();
  std::shared_ptr<Storage> _storage;  // null for the empty dictionary
};

// One property-list value: a dictionary, array, string (UTF-8), integer (64 bits, signed or
// unsigned), real, boolean, date or data. There is no null value: absence is an empty optional or a
// null pointer.
//
// Copies share their storage, so a deep copy costs a reference count. Equality is deep and strict
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

  Value(const Value&);
  Value(Value&&) noexcept;
  Value& operator=(const Value&);
  Value& operator=(Value&&) noexcept;
  ~Value();

  Kind kind() const;

  // What the value holds when it is of that kind, else null or empty. Pointers are valid until the
  // value changes.
  const Dictionary* asDictionary() const;
  const Array* asArray() const;
  const std::string* asString() const;
  // Empty also for an integer above the signed range.
  std::optional<std::int64_t> asInteger() const;
  // Empty also for a negative integer.
  std::optional<std::uint64_t> asUnsigned() const;
  std::optional<double> asReal() const;
  std::optional<bool> asBoolean() const;
  std::optional<Date> asDate() const;
  const Bytes* asData() const;
  // The shared text of a string, else null.
  std::shared_ptr<const std::string> sharedString() const;

  PROPERTYLIST_EXPORT friend bool operator==(const Value& a, const Value& b);

 private:
  friend class Array;
  friend class Dictionary;
  class Comparison;
  struct Integer {
    std::uint64_t bits = 0;
    bool negative = false;
    friend bool operator==(Integer, Integer) = default;
  };
  using Content = std::variant<Dictionary, Array, std::shared_ptr<const std::string>, Integer,
                               double, bool, Date, std::shared_ptr<const Bytes>>;
  Content _content;
};

class PROPERTYLIST_EXPORT Dictionary::Entry {
 public:
  Entry(std::string_view key, Value value);
  // Shares the text of `key` with other entries; `key` is not null.
  Entry(std::shared_ptr<const std::string> key, Value value);
  const std::string& key() const { return *_key; }
  const Value& value() const { return _value; }

 private:
  friend class Dictionary;
  friend class Value;
  std::shared_ptr<const std::string> _key;
  Value _value;
};

template <typename T>
requires std::same_as<T, bool> Value::Value(T boolean)
    : _content(std::in_place_type<bool>, boolean) {}

template <typename T>
requires(std::integral<T> && !std::same_as<T, bool> &&
         !std::same_as<T, char>) Value::Value(T integer)
    : _content(Integer{static_cast<std::uint64_t>(integer), std::cmp_less(integer, 0)}) {}

template <std::floating_point T>
Value::Value(T real) : _content(std::in_place_type<double>, static_cast<double>(real)) {}

// The value under `key` when it is of the named kind, else null or empty: one step for the usual
// two.
PROPERTYLIST_EXPORT const std::string* findString(const Dictionary& dictionary,
                                                  std::string_view key);
PROPERTYLIST_EXPORT const Array* findArray(const Dictionary& dictionary, std::string_view key);
PROPERTYLIST_EXPORT const Dictionary* findDictionary(const Dictionary& dictionary,
                                                     std::string_view key);
PROPERTYLIST_EXPORT std::optional<bool> findBoolean(const Dictionary& dictionary,
                                                    std::string_view key);

}  // namespace propertylist
