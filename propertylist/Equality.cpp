#include <algorithm>
#include <cstring>
#include <unordered_map>
#include <utility>
#include <vector>

#include "propertylist/Value.h"

namespace propertylist {

// One comparison of two values. What is still to be compared waits in a list, not on the stack. Two
// storages that have been put on the list together count as equal from then on, since one
// difference anywhere ends the comparison; so storage that is reached on many ways is compared
// once, and the effort follows what is stored and not what it stands for.
class Value::Comparison {
 public:
  bool areEqual(const Value& a, const Value& b) {
    _add(a, b);
    while (!_waiting.empty()) {
      const auto [left, right] = _waiting.back();
      _waiting.pop_back();
      if (!_compare(left->_content, right->_content)) return false;
    }
    return true;
  }

 private:
  // Texts and data up to this size are compared faster than they are looked up.
  static constexpr std::size_t kShort = 64;

  void _add(const Value& a, const Value& b) { _waiting.emplace_back(&a, &b); }

  bool _compare(const Content& a, const Content& b) {
    if (a.index() != b.index()) return false;
    if (const auto* const left = std::get_if<Dictionary>(&a)) {
      return _compare(*left, std::get<Dictionary>(b));
    }
    if (const auto* const left = std::get_if<Array>(&a)) return _compare(*left, std::get<Array>(b));
    if (const auto* const left = std::get_if<std::shared_ptr<const std::string>>(&a)) {
      return _compareBytes(*left, std::get<std::shared_ptr<const std::string>>(b));
    }
    if (const auto* const left = std::get_if<std::shared_ptr<const Bytes>>(&a)) {
      return _compareBytes(*left, std::get<std::shared_ptr<const Bytes>>(b));
    }
    if (const auto* const left = std::get_if<Integer>(&a)) return *left == std::get<Integer>(b);
    if (const auto* const left = std::get_if<double>(&a)) {
      return std::bit_cast<std::uint64_t>(*left) ==
             std::bit_cast<std::uint64_t>(std::get<double>(b));
    }
    if (const auto* const left = std::get_if<bool>(&a)) return *left == std::get<bool>(b);
    return std::get<Date>(a) == std::get<Date>(b);
  }

  bool _compare(const Array& a, const Array& b) {
    if (a.size() != b.size()) return false;
    if (a.empty() || !_meetFirst(a._storage, b._storage)) return true;
    for (std::size_t i = 0; i < a.size(); ++i) _add(a[i], b[i]);
    return true;
  }

  bool _compare(const Dictionary& a, const Dictionary& b) {
    if (a.size() != b.size()) return false;
    if (a.empty() || !_meetFirst(a._storage, b._storage)) return true;
    const Dictionary::Entry* right = b.begin();
    for (const Dictionary::Entry& left : a) {
      if (!_compareBytes(left._key, right->_key)) return false;
      _add(left._value, right->_value);
      ++right;
    }
    return true;
  }

  template <typename Sequence>
  bool _compareBytes(const std::shared_ptr<Sequence>& a, const std::shared_ptr<Sequence>& b) {
    if (a == b) return true;
    if (a->size() != b->size()) return false;
    if (a->size() > kShort && !_meetFirst(a, b)) return true;
    return std::equal(a->begin(), a->end(), b->begin());
  }

  // Whether these two have to be compared: not when they are one storage or already count as equal.
  // Storages that have one owner each meet once at most for each meeting of their owners.
  template <typename Storage>
  bool _meetFirst(const std::shared_ptr<Storage>& a, const std::shared_ptr<Storage>& b) {
    if (a == b) return false;
    if (a.use_count() == 1 && b.use_count() == 1) return true;
    const void* const left = _representative(a.get());
    const void* const right = _representative(b.get());
    if (left == right) return false;
    _joinedTo[left] = right;
    return true;
  }

  // The one of all storages joined with `storage` that stands for them. Shortens the way on the go.
  const void* _representative(const void* storage) {
    auto found = _joinedTo.find(storage);
    while (found != _joinedTo.end()) {
      const auto next = _joinedTo.find(found->second);
      if (next == _joinedTo.end()) return found->second;
      found->second = next->second;
      storage = found->second;
      found = _joinedTo.find(storage);
    }
    return storage;
  }

  std::vector<std::pair<const Value*, const Value*>> _waiting;
  std::unordered_map<const void*, const void*> _joinedTo;
};

bool operator==(const Value& a, const Value& b) { return Value::Comparison().areEqual(a, b); }
bool operator==(const Array& a, const Array& b) {
  return a.sharesStorageWith(b) || Value(a) == Value(b);
}
bool operator==(const Dictionary& a, const Dictionary& b) {
  return a.sharesStorageWith(b) || Value(a) == Value(b);
}

}  // namespace propertylist
