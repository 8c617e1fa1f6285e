#include "propertylist/Value.h"

#include <algorithm>
#include <new>
#include <utility>
#include <vector>

namespace propertylist {

using storage::Owner;

namespace {

// What owned arrays and dictionaries have in common: they hold further values. One that dies while
// another is being destroyed is put on a list instead of being destroyed inside of it, so that no
// nesting is deep enough for the stack; the list runs through the owners themselves, because an
// allocation could fail.
class ContainerOwner : public Owner {
 protected:
  ContainerOwner() : Owner(false) {}

 private:
  void _destroy() noexcept override;
  ContainerOwner* _next = nullptr;
};

thread_local ContainerOwner* toBeDestroyed = nullptr;
thread_local bool isDestroying = false;

void ContainerOwner::_destroy() noexcept {
  _next = toBeDestroyed;
  toBeDestroyed = this;
  if (isDestroying) return;
  isDestroying = true;
  while (toBeDestroyed != nullptr) {
    ContainerOwner* const first = toBeDestroyed;
    toBeDestroyed = first->_next;
    delete first;
  }
  isDestroying = false;
}

}  // namespace

// Text and data

// The text follows the object.
struct Value::OwnTextNode final : Owner, TextNode {
  explicit OwnTextNode(std::string_view t)
      : Owner(false), TextNode(this, {reinterpret_cast<char*>(this + 1), t.size()}) {
    t.copy(reinterpret_cast<char*>(this + 1), t.size());
  }
  static OwnTextNode* make(std::string_view t) {
    void* const memory = ::operator new(sizeof(OwnTextNode) + t.size());
    return new (memory) OwnTextNode(t);
  }
  void _destroy() noexcept override {
    this->~OwnTextNode();
    ::operator delete(this);
  }
};

struct Value::SharedTextNode final : Owner, TextNode {
  explicit SharedTextNode(std::shared_ptr<const std::string> s)
      : Owner(false), TextNode(this, *s), string(std::move(s)) {}
  std::shared_ptr<const std::string> string;
};

struct Value::OwnDataNode final : Owner, DataNode {
  explicit OwnDataNode(Bytes bytes) : Owner(false), DataNode(this, std::move(bytes)) {}
};

storage::Node* Value::_newText(std::string_view text) { return OwnTextNode::make(text); }

// Array

struct Array::OwnNode final : ContainerOwner, Node {
  explicit OwnNode(std::vector<Value> v) : Node(this, v.data(), v.size()), values(std::move(v)) {}
  void update() {
    first = values.data();
    setSize(values.size());
  }
  std::vector<Value> values;
};

Array::Array(std::initializer_list<Value> values) : Array(std::vector<Value>(values)) {}

Array::Array(std::vector<Value> values) {
  if (!values.empty()) _bits = storage::bitsOf(new OwnNode(std::move(values)));
}

bool Array::contains(const Value& value) const { return std::find(begin(), end(), value) != end(); }

void Array::append(Value value) {
  OwnNode& own = _mutable();
  own.values.push_back(std::move(value));
  own.update();
}

void Array::replace(std::size_t index, Value value) { _mutable().values[index] = std::move(value); }

void Array::removeAt(std::size_t index) {
  OwnNode& own = _mutable();
  own.values.erase(own.values.begin() + static_cast<std::ptrdiff_t>(index));
  own.update();
}

// This array's own node, which nobody shares. What an arena holds is never changed.
Array::OwnNode& Array::_mutable() {
  if (_bits == 0 || _node()->owner->isArena() || !_node()->owner->isSole())
    *this = Array(new OwnNode(std::vector<Value>(begin(), end())));
  return static_cast<OwnNode&>(*static_cast<Node*>(_node()));
}

// Dictionary

struct Dictionary::OwnNode final : ContainerOwner, Node {
  explicit OwnNode(std::vector<Entry> e) : Node(this, e.data(), e.size()), entries(std::move(e)) {}
  void update() {
    first = entries.data();
    setSize(entries.size());
  }
  std::vector<Entry> entries;
};

Dictionary::Entry::Entry(std::string_view key, Value value) : _value(std::move(value)) {
  _setKey(storage::bitsOf(Value::_newText(key)));
}

Dictionary::Dictionary(std::initializer_list<std::pair<std::string_view, Value>> entries)
    : Dictionary(std::vector<Entry>([&entries] {
        std::vector<Entry> converted;
        converted.reserve(entries.size());
        for (const auto& [key, value] : entries) converted.emplace_back(key, value);
        return converted;
      }())) {}

Dictionary::Dictionary(std::vector<Entry> entries) {
  const auto isBefore = [](const Entry& a, const Entry& b) { return a.key() < b.key(); };
  const auto isNotAscending = [](const Entry& a, const Entry& b) { return a.key() >= b.key(); };
  if (std::adjacent_find(entries.begin(), entries.end(), isNotAscending) != entries.end()) {
    std::stable_sort(entries.begin(), entries.end(), isBefore);
    // Of entries with one key, the last one stays: the first one that a walk from the end meets.
    const auto kept =
        std::unique(entries.rbegin(), entries.rend(),
                    [](const Entry& a, const Entry& b) { return a.key() == b.key(); });
    entries.erase(entries.begin(), kept.base());
  }
  if (!entries.empty()) _bits = storage::bitsOf(new OwnNode(std::move(entries)));
}

const Dictionary::Entry* Dictionary::_lowerBound(std::string_view key) const {
  return std::lower_bound(begin(), end(), key,
                          [](const Entry& entry, std::string_view k) { return entry.key() < k; });
}

// Few entries are faster walked over than searched: most differ in the length of their key, and
// others in its last letter.
const Value* Dictionary::find(std::string_view key) const {
  constexpr std::size_t kFew = 32;
  if (size() <= kFew && !key.empty()) {
    const Entry* const last = end();
    for (const Entry* entry = begin(); entry != last; ++entry) {
      const Text& text = entry->key();
      if (text.size() == key.size() && text.back() == key.back() && text == key)
        return &entry->value();
    }
    return nullptr;
  }
  const Entry* const entry = _lowerBound(key);
  return entry != end() && entry->key() == key ? &entry->value() : nullptr;
}

void Dictionary::set(std::string_view key, Value value) {
  const Entry* const place =
      !empty() && (end() - 1)->key() < key ? end() : _lowerBound(key);  // ascending keys: no search
  const std::ptrdiff_t index = place - begin();
  if (place != end() && place->key() == key) {
    _mutable().entries[static_cast<std::size_t>(index)]._value = std::move(value);
    return;
  }
  Entry entry(key, std::move(value));
  OwnNode& own = _mutable();
  own.entries.insert(own.entries.begin() + index, std::move(entry));
  own.update();
}

bool Dictionary::remove(std::string_view key) {
  const Entry* const entry = _lowerBound(key);
  if (entry == end() || entry->key() != key) return false;
  const std::ptrdiff_t index = entry - begin();
  OwnNode& own = _mutable();
  own.entries.erase(own.entries.begin() + index);
  own.update();
  return true;
}

Dictionary::OwnNode& Dictionary::_mutable() {
  if (_bits == 0 || _node()->owner->isArena() || !_node()->owner->isSole())
    *this = Dictionary(new OwnNode(std::vector<Entry>(begin(), end())));
  return static_cast<OwnNode&>(*static_cast<Node*>(_node()));
}

// Value

Value::Value(Dictionary dictionary)
    : _keyAndTag(static_cast<std::uint64_t>(Kind::dictionary)),
      _content(Reference(std::move(dictionary))) {}
Value::Value(Array array)
    : _keyAndTag(static_cast<std::uint64_t>(Kind::array)), _content(Reference(std::move(array))) {}
// NOLINTNEXTLINE(performance-unnecessary-value-param): whoever has a string to give away does
Value::Value(std::string string) : Value(std::string_view(string)) {}
Value::Value(std::string_view string) : Value(NodeTag(), Kind::string, _newText(string)) {}
Value::Value(const char* string) : Value(std::string_view(string)) {}
Value::Value(std::shared_ptr<const std::string> string)
    : Value(NodeTag(), Kind::string, new SharedTextNode(std::move(string))) {}
Value::Value(Date date) : Value(Kind::date, std::bit_cast<std::uint64_t>(date.secondsSince2001)) {}
Value::Value(Bytes data) : Value(NodeTag(), Kind::data, new OwnDataNode(std::move(data))) {}

Value& Value::operator=(const Value& other) noexcept {
  return *this = Value(other);  // a copy first, because `other` may live inside of what this holds
}

Value& Value::operator=(Value&& other) noexcept {
  Value taken(std::move(other));
  const std::uint64_t changed = (_keyAndTag ^ taken._keyAndTag) & kTagBits;
  _keyAndTag ^= changed;
  taken._keyAndTag ^= changed;
  std::swap(_content.bits, taken._content.bits);  // of a reference too: it is moved, not counted
  return *this;
}

// Lookups by key and kind

const Text* findString(const Dictionary& dictionary, std::string_view key) {
  const Value* const value = dictionary.find(key);
  return value != nullptr ? value->asString() : nullptr;
}

const Array* findArray(const Dictionary& dictionary, std::string_view key) {
  const Value* const value = dictionary.find(key);
  return value != nullptr ? value->asArray() : nullptr;
}

const Dictionary* findDictionary(const Dictionary& dictionary, std::string_view key) {
  const Value* const value = dictionary.find(key);
  return value != nullptr ? value->asDictionary() : nullptr;
}

std::optional<bool> findBoolean(const Dictionary& dictionary, std::string_view key) {
  const Value* const value = dictionary.find(key);
  return value != nullptr ? value->asBoolean() : std::nullopt;
}

}  // namespace propertylist
