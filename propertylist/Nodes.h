#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "propertylist/Storage.h"
#include "propertylist/Value.h"  // includes this at its end

// The nodes behind values (see Storage.h), and what only looks into them: nearly everything that is
// done with values does, so it costs no call. Part of Value.h.
namespace propertylist {

struct Value::TextNode : storage::Node {
  TextNode(storage::Owner* o, std::string_view t) : Node(o), text(t) {}
  Text text;
};

struct Value::DataNode : storage::Node {
  DataNode(storage::Owner* o, Bytes b) : Node(o), data(std::move(b)) {}
  Bytes data;
};

// What the nodes of arrays and of dictionaries have in common.
template <typename Member>
struct ContainerNode : storage::Node {
  ContainerNode(storage::Owner* o, const Member* f, std::size_t s)
      : storage::Node(o), first(f), size(s & kMostMembers), isShared(false) {}
  void setSize(std::size_t s) { size = s & kMostMembers; }

  static constexpr std::size_t kMostMembers = ~std::size_t{0} >> 1U;
  const Member* first;
  std::size_t size : 63;
  bool isShared : 1;  // of an arena: its file refers to it more than once
};

struct Array::Node : ContainerNode<Value> {
  using ContainerNode::ContainerNode;
};

struct Dictionary::Node : ContainerNode<Dictionary::Entry> {
  using ContainerNode::ContainerNode;
};

static_assert(static_cast<std::uint64_t>(Kind::data) == 7, "three bits hold each kind");
static_assert(alignof(storage::Node) >= 8, "three bits of a key's address are free");

inline const Value::TextNode& Value::_textNode() const {
  return *static_cast<const TextNode*>(_content.reference._node());
}

inline const Value::DataNode& Value::_dataNode() const {
  return *static_cast<const DataNode*>(_content.reference._node());
}

inline const Array::Node* Array::_array() const { return static_cast<const Node*>(_node()); }

inline std::size_t Array::size() const { return _bits != 0 ? _array()->size : 0; }

inline const Value& Array::operator[](std::size_t index) const { return _array()->first[index]; }

inline const Value* Array::begin() const { return _bits != 0 ? _array()->first : nullptr; }

inline const Value* Array::end() const { return begin() + size(); }

inline const Dictionary::Node* Dictionary::_dictionary() const {
  return static_cast<const Node*>(_node());
}

inline std::size_t Dictionary::size() const { return _bits != 0 ? _dictionary()->size : 0; }

inline const Dictionary::Entry* Dictionary::begin() const {
  return _bits != 0 ? _dictionary()->first : nullptr;
}

inline const Dictionary::Entry* Dictionary::end() const { return begin() + size(); }

inline Dictionary::Entry::Entry(const Entry& other) noexcept : _value(other._value) {
  if (other._keyBits() == 0) return;
  _setKey(other._keyBits());
  other._value._key()->owner->retain();
}

inline Dictionary::Entry::Entry(Entry&& other) noexcept : _value(std::move(other._value)) {
  _setKey(other._keyBits());
  other._value._keyAndTag &= Value::kTagBits;
}

inline Dictionary::Entry& Dictionary::Entry::operator=(const Entry& other) noexcept {
  return *this = Entry(other);
}

inline Dictionary::Entry& Dictionary::Entry::operator=(Entry&& other) noexcept {
  Entry taken(std::move(other));
  std::swap(_value._keyAndTag, taken._value._keyAndTag);
  std::swap(_value._content.bits, taken._value._content.bits);
  return *this;
}

inline Dictionary::Entry::~Entry() {
  if (_keyBits() != 0) _value._key()->owner->release();
}

inline const Text& Dictionary::Entry::key() const {
  return static_cast<const Value::TextNode*>(_value._key())->text;
}

inline const Dictionary* Value::asDictionary() const {
  return _tag() == Kind::dictionary ? &_content.dictionary : nullptr;
}

inline const Array* Value::asArray() const {
  return _tag() == Kind::array ? &_content.array : nullptr;
}

inline const Text* Value::asString() const {
  return _tag() == Kind::string ? &_textNode().text : nullptr;
}

inline std::optional<std::int64_t> Value::asInteger() const {
  const auto asSigned = static_cast<std::int64_t>(_content.bits);
  if (_isNegative() || (_tag() == Kind::integer && asSigned >= 0)) return asSigned;
  return std::nullopt;
}

inline std::optional<std::uint64_t> Value::asUnsigned() const {
  return _tag() == Kind::integer ? std::optional(_content.bits) : std::nullopt;
}

inline std::optional<double> Value::asReal() const {
  return _tag() == Kind::real ? std::optional(std::bit_cast<double>(_content.bits)) : std::nullopt;
}

inline std::optional<bool> Value::asBoolean() const {
  return kind() == Kind::boolean ? std::optional(_content.bits != 0) : std::nullopt;
}

inline std::optional<Date> Value::asDate() const {
  return _tag() == Kind::date ? std::optional(Date{std::bit_cast<double>(_content.bits)})
                              : std::nullopt;
}

inline const Bytes* Value::asData() const {
  return _tag() == Kind::data ? &_dataNode().data : nullptr;
}

}  // namespace propertylist
