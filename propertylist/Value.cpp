#include "propertylist/Value.h"

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

namespace propertylist {
namespace {

// What array and dictionary storage have in common: they hold further values.
struct ContainerStorage {
  ContainerStorage() = default;
  ContainerStorage(const ContainerStorage&) = delete;
  ContainerStorage& operator=(const ContainerStorage&) = delete;
  virtual ~ContainerStorage() = default;
  ContainerStorage* next = nullptr;  // in the list of what is to be destroyed
};

thread_local ContainerStorage* toBeDestroyed = nullptr;
thread_local bool isDestroying = false;

// The deleter of every storage. A storage that dies while another one is being destroyed is put on
// a list instead of being destroyed inside of it, so that no nesting is deep enough for the stack;
// the list runs through the storages themselves, because an allocation could fail.
void destroyStorage(ContainerStorage* storage) noexcept {
  storage->next = toBeDestroyed;
  toBeDestroyed = storage;
  if (isDestroying) return;
  isDestroying = true;
  while (toBeDestroyed != nullptr) {
    ContainerStorage* const first = toBeDestroyed;
    toBeDestroyed = first->next;
    delete first;
  }
  isDestroying = false;
}

// Whether nobody else shares `storage`, so that it may be changed.
template <typename Storage>
bool isSole(const std::shared_ptr<Storage>& storage) {
  if (storage.use_count() != 1) return false;
  // The count is read without ordering. Taking another reference orders what the last other owner
  // did on its thread before what is done here.
  // NOLINTNEXTLINE(performance-unnecessary-copy-initialization): the copy is made for that order
  const std::shared_ptr<Storage> ordering = storage;
  return true;
}

std::shared_ptr<const std::string> sharedText(std::string text) {
  return std::make_shared<const std::string>(std::move(text));
}

}  // namespace

struct Array::Storage : ContainerStorage {
  explicit Storage(std::vector<Value> v) : values(std::move(v)) {}
  std::vector<Value> values;
};

struct Dictionary::Storage : ContainerStorage {
  explicit Storage(std::vector<Entry> e) : entries(std::move(e)) {}
  std::vector<Entry> entries;
};

// Array

Array::Array() = default;
Array::Array(const Array&) = default;
Array::Array(Array&&) noexcept = default;
Array& Array::operator=(const Array&) = default;
Array& Array::operator=(Array&&) noexcept = default;
Array::~Array() = default;

Array::Array(std::initializer_list<Value> values) : Array(std::vector<Value>(values)) {}

Array::Array(std::vector<Value> values) {
  if (!values.empty()) _storage.reset(new Storage(std::move(values)), destroyStorage);
}

std::size_t Array::size() const { return _storage ? _storage->values.size() : 0; }
const Value& Array::operator[](std::size_t index) const { return _storage->values[index]; }
const Value* Array::begin() const { return _storage ? _storage->values.data() : nullptr; }
const Value* Array::end() const { return begin() + size(); }

bool Array::contains(const Value& value) const { return std::find(begin(), end(), value) != end(); }

void Array::append(Value value) { _mutable().push_back(std::move(value)); }
void Array::replace(std::size_t index, Value value) { _mutable()[index] = std::move(value); }
void Array::removeAt(std::size_t index) {
  std::vector<Value>& values = _mutable();
  values.erase(values.begin() + static_cast<std::ptrdiff_t>(index));
}

std::vector<Value>& Array::_mutable() {
  if (!isSole(_storage)) {
    _storage.reset(new Storage(std::vector<Value>(begin(), end())), destroyStorage);
  }
  return _storage->values;
}

// Dictionary

Dictionary::Dictionary() = default;
Dictionary::Dictionary(const Dictionary&) = default;
Dictionary::Dictionary(Dictionary&&) noexcept = default;
Dictionary& Dictionary::operator=(const Dictionary&) = default;
Dictionary& Dictionary::operator=(Dictionary&&) noexcept = default;
Dictionary::~Dictionary() = default;

Dictionary::Entry::Entry(std::string_view key, Value value)
    : _key(sharedText(std::string(key))), _value(std::move(value)) {}

Dictionary::Entry::Entry(std::shared_ptr<const std::string> key, Value value)
    : _key(std::move(key)), _value(std::move(value)) {}

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
  *this = _fromAscending(std::move(entries));
}

Dictionary Dictionary::_fromAscending(std::vector<Entry> entries) {
  Dictionary dictionary;
  if (!entries.empty()) dictionary._storage.reset(new Storage(std::move(entries)), destroyStorage);
  return dictionary;
}

std::size_t Dictionary::size() const { return _storage ? _storage->entries.size() : 0; }
const Dictionary::Entry* Dictionary::begin() const {
  return _storage ? _storage->entries.data() : nullptr;
}
const Dictionary::Entry* Dictionary::end() const { return begin() + size(); }

const Dictionary::Entry* Dictionary::_lowerBound(std::string_view key) const {
  return std::lower_bound(begin(), end(), key,
                          [](const Entry& entry, std::string_view k) { return entry.key() < k; });
}

const Value* Dictionary::find(std::string_view key) const {
  const Entry* const entry = _lowerBound(key);
  return entry != end() && entry->key() == key ? &entry->value() : nullptr;
}

void Dictionary::set(std::string_view key, Value value) {
  const Entry* const place =
      !empty() && (end() - 1)->key() < key ? end() : _lowerBound(key);  // ascending keys: no search
  const std::ptrdiff_t index = place - begin();
  if (place != end() && place->key() == key) {
    _mutable()[static_cast<std::size_t>(index)]._value = std::move(value);
    return;
  }
  Entry entry(key, std::move(value));
  std::vector<Entry>& entries = _mutable();
  entries.insert(entries.begin() + index, std::move(entry));
}

bool Dictionary::remove(std::string_view key) {
  const Entry* const entry = _lowerBound(key);
  if (entry == end() || entry->key() != key) return false;
  const std::ptrdiff_t index = entry - begin();
  std::vector<Entry>& entries = _mutable();
  entries.erase(entries.begin() + index);
  return true;
}

std::vector<Dictionary::Entry>& Dictionary::_mutable() {
  if (!isSole(_storage)) {
    _storage.reset(new Storage(std::vector<Entry>(begin(), end())), destroyStorage);
  }
  return _storage->entries;
}

// Value

Value::Value(Dictionary dictionary) : _content(std::move(dictionary)) {}
Value::Value(Array array) : _content(std::move(array)) {}
Value::Value(std::string string) : _content(sharedText(std::move(string))) {}
Value::Value(std::string_view string) : Value(std::string(string)) {}
Value::Value(const char* string) : Value(std::string(string)) {}
Value::Value(std::shared_ptr<const std::string> string) : _content(std::move(string)) {}
Value::Value(Date date) : _content(date) {}
Value::Value(Bytes data) : _content(std::make_shared<const Bytes>(std::move(data))) {}

Value::Value(const Value&) = default;
Value::~Value() = default;

// A value that was moved from is an empty dictionary, so that a string always has a text.
Value::Value(Value&& other) noexcept : _content(std::move(other._content)) {
  other._content.emplace<Dictionary>();
}

Value& Value::operator=(const Value& other) {
  Value copy(other);  // first, because `other` may live inside of what this value holds
  _content.swap(copy._content);
  return *this;
}

Value& Value::operator=(Value&& other) noexcept {
  Value taken(std::move(other));
  _content.swap(taken._content);
  return *this;
}

Kind Value::kind() const { return static_cast<Kind>(_content.index()); }

const Dictionary* Value::asDictionary() const { return std::get_if<Dictionary>(&_content); }
const Array* Value::asArray() const { return std::get_if<Array>(&_content); }

const std::string* Value::asString() const {
  const auto* const text = std::get_if<std::shared_ptr<const std::string>>(&_content);
  return text != nullptr ? text->get() : nullptr;
}

std::optional<std::int64_t> Value::asInteger() const {
  const Integer* const integer = std::get_if<Integer>(&_content);
  if (integer == nullptr) return std::nullopt;
  const auto asSigned = static_cast<std::int64_t>(integer->bits);
  if ((asSigned < 0) != integer->negative) return std::nullopt;
  return asSigned;
}

std::optional<std::uint64_t> Value::asUnsigned() const {
  const Integer* const integer = std::get_if<Integer>(&_content);
  if (integer == nullptr || integer->negative) return std::nullopt;
  return integer->bits;
}

std::optional<double> Value::asReal() const {
  const double* const real = std::get_if<double>(&_content);
  return real != nullptr ? std::optional(*real) : std::nullopt;
}

std::optional<bool> Value::asBoolean() const {
  const bool* const boolean = std::get_if<bool>(&_content);
  return boolean != nullptr ? std::optional(*boolean) : std::nullopt;
}

std::optional<Date> Value::asDate() const {
  const Date* const date = std::get_if<Date>(&_content);
  return date != nullptr ? std::optional(*date) : std::nullopt;
}

const Bytes* Value::asData() const {
  const auto* const data = std::get_if<std::shared_ptr<const Bytes>>(&_content);
  return data != nullptr ? data->get() : nullptr;
}

std::shared_ptr<const std::string> Value::sharedString() const {
  const auto* const text = std::get_if<std::shared_ptr<const std::string>>(&_content);
  return text != nullptr ? *text : nullptr;
}

// Lookups by key and kind

const std::string* findString(const Dictionary& dictionary, std::string_view key) {
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
