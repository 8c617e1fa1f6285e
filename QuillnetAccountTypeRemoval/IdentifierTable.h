#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <new>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "propertylist/TextTable.h"

namespace accountsettings {

// What several IdentifierTables may share.
struct IdentifierNames {
  std::string identifiers;  // one behind the other
  // Of the entries that are there, and of those that were removed while this was shared.
  propertylist::TextTable indexes;
};

// What a store knows by identifier. Visited in the order in which the identifiers came; one that
// was removed and comes again is the last. The identifiers lie one behind the other in one text, so
// that an entry costs no allocation of its own; a table that was made from another one shares them
// with it until either gets a further one; so both are for one thread at a time. Pointers and
// references are valid until the next set.
template <typename T>
class IdentifierTable {
 public:
  class Iterator;

  std::size_t size() const { return _entries.size() - _removed; }
  bool empty() const { return size() == 0; }
  // Null when there is nothing under the identifier.
  T* find(std::string_view identifier) {
    const std::size_t index = _indexOf(propertylist::TextTable::hashOf(identifier), identifier);
    return _isThere(index) ? &_entries[index].value : nullptr;
  }
  const T* find(std::string_view identifier) const {
    return const_cast<IdentifierTable*>(this)->find(identifier);
  }
  bool contains(std::string_view identifier) const { return find(identifier) != nullptr; }
  // The identifier is there.
  const T& at(std::string_view identifier) const { return *find(identifier); }
  // The value under the identifier, put there when there was none.
  T& operator[](std::string_view identifier);
  void set(std::string_view identifier, T value) { (*this)[identifier] = std::move(value); }
  // Does nothing when there is nothing under the identifier. Never throws.
  void remove(std::string_view identifier);
  void clear() { *this = IdentifierTable(); }
  // Makes room for so many more.
  void reserve(std::size_t more);
  // A table of the same identifiers with `valueOf` of each value: nothing is looked up for it.
  template <typename Other, typename ValueOf>
  IdentifierTable<Other> withValues(const ValueOf& valueOf) const;

  // Pairs of identifier and value.
  Iterator begin() const { return Iterator(*this, 0); }
  Iterator end() const { return Iterator(*this, _entries.size()); }

 private:
  template <typename>
  friend class IdentifierTable;
  static constexpr std::uint32_t kRemoved = std::uint32_t{1} << 31U;
  // Where the identifier lies among all of them, in two numbers of half the usual size, and what is
  // under it.
  struct Entry {
    std::uint32_t begin = 0;
    std::uint32_t sizeAndRemoved = 0;
    T value = T();
    bool isThere() const { return (sizeAndRemoved & kRemoved) == 0; }
    std::size_t size() const { return sizeAndRemoved & ~kRemoved; }
  };
  std::string_view _identifierOf(const Entry& entry) const {
    return {_names->identifiers.data() + entry.begin, entry.size()};
  }
  std::size_t _indexOf(std::uint64_t hash, std::string_view identifier) const {
    if (!_names) return propertylist::TextTable::kNone;
    return _names->indexes.find(
        hash, [&](std::size_t index) { return _identifierOf(_entries[index]) == identifier; });
  }
  bool _isThere(std::size_t index) const {
    return index != propertylist::TextTable::kNone && _entries[index].isThere();
  }
  IdentifierNames& _ownNames();
  // Whether what is not there takes more memory than what is.
  bool _isMostlyRemoved() const {
    return _names && _removedBytes + _removed * sizeof(Entry) >
                         (_names->identifiers.size() + _entries.size() * sizeof(Entry)) / 2;
  }
  void _forgetRemoved();

  std::shared_ptr<IdentifierNames> _names;  // null in a new table
  std::vector<Entry> _entries;
  std::size_t _removed = 0;       // entries that are not there any more
  std::size_t _removedBytes = 0;  // of their identifiers
};

template <typename T>
class IdentifierTable<T>::Iterator {
 public:
  Iterator(const IdentifierTable& table, std::size_t index) : _table(&table), _index(index) {
    _passRemoved();
  }
  std::pair<std::string_view, const T&> operator*() const {
    const Entry& entry = _table->_entries[_index];
    return {_table->_identifierOf(entry), entry.value};
  }
  Iterator& operator++() {
    ++_index;
    _passRemoved();
    return *this;
  }
  bool operator==(const Iterator& other) const { return _index == other._index; }

 private:
  void _passRemoved() {
    while (_index < _table->_entries.size() && !_table->_entries[_index].isThere()) ++_index;
  }
  const IdentifierTable* _table;
  std::size_t _index;
};

// Its own from now on.
template <typename T>
IdentifierNames& IdentifierTable<T>::_ownNames() {
  if (!_names) {
    _names = std::make_shared<IdentifierNames>();
  } else if (_names.use_count() > 1) {
    _names = std::make_shared<IdentifierNames>(*_names);
  }
  return *_names;
}

template <typename T>
T& IdentifierTable<T>::operator[](std::string_view identifier) {
  const std::uint64_t hash = propertylist::TextTable::hashOf(identifier);
  const std::size_t known = _indexOf(hash, identifier);
  if (_isThere(known)) return _entries[known].value;
  if (_isMostlyRemoved()) {
    const std::string kept(identifier);  // it may lie among those that are forgotten
    _forgetRemoved();
    return (*this)[kept];
  }
  IdentifierNames& names = _ownNames();
  if (identifier.size() >= kRemoved - names.identifiers.size()) throw std::bad_alloc();
  names.indexes.makeRoomFor(1);
  const auto begin = static_cast<std::uint32_t>(names.identifiers.size());
  names.identifiers += identifier;
  _entries.push_back({begin, static_cast<std::uint32_t>(identifier.size())});
  if (known != propertylist::TextTable::kNone) names.indexes.remove(hash, known);
  names.indexes.add(hash, _entries.size() - 1);
  return _entries.back().value;
}

template <typename T>
void IdentifierTable<T>::reserve(std::size_t more) {
  constexpr std::size_t kUsualSize = 36;  // of a UUID
  IdentifierNames& names = _ownNames();
  _entries.reserve(_entries.size() + more);
  names.identifiers.reserve(names.identifiers.size() + more * kUsualSize);
  names.indexes.makeRoomFor(more);
}

template <typename T>
template <typename Other, typename ValueOf>
IdentifierTable<Other> IdentifierTable<T>::withValues(const ValueOf& valueOf) const {
  IdentifierTable<Other> other;
  other._names = _names;
  other._removed = _removed;
  other._removedBytes = _removedBytes;
  other._entries.reserve(_entries.size());
  for (const Entry& entry : _entries)
    other._entries.push_back(
        {entry.begin, entry.sizeAndRemoved, entry.isThere() ? valueOf(entry.value) : Other()});
  return other;
}

// From an index that is shared nothing is removed: the other table may need it, and a copy could
// fail.
template <typename T>
void IdentifierTable<T>::remove(std::string_view identifier) {
  const std::uint64_t hash = propertylist::TextTable::hashOf(identifier);
  const std::size_t index = _indexOf(hash, identifier);
  if (!_isThere(index)) return;
  if (_names.use_count() == 1) _names->indexes.remove(hash, index);
  _removedBytes += _entries[index].size();
  _entries[index].sizeAndRemoved |= kRemoved;
  _entries[index].value = T();
  ++_removed;
}

// Values are moved, because one may be large.
template <typename T>
void IdentifierTable<T>::_forgetRemoved() {
  IdentifierTable kept;
  IdentifierNames& names = kept._ownNames();
  names.identifiers.reserve(_names->identifiers.size() - _removedBytes);
  names.indexes.makeRoomFor(size());
  kept._entries.reserve(size());
  // From here on nothing fails.
  for (Entry& entry : _entries) {
    if (entry.isThere()) kept.set(_identifierOf(entry), std::move(entry.value));
  }
  *this = std::move(kept);
}

}  // namespace accountsettings
