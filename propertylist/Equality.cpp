#include <algorithm>
#include <unordered_map>
#include <vector>

#include "propertylist/Value.h"

namespace propertylist {

// One comparison of two values. What is still to be compared waits in a list, not on the stack. Two
// nodes that have been put on the list together count as equal from then on, since one difference
// anywhere ends the comparison; so a node that is reached on many ways is compared once, and the
// effort follows what is stored and not what it stands for.
class Value::Comparison {
 public:
  static bool areEqual(const Value& a, const Value& b) {
    Comparison comparison;
    return comparison._compare({&a, &b, false}) && comparison._compareWaiting();
  }

 private:
  // Texts and data up to this size are compared faster than they are looked up.
  static constexpr std::size_t kShort = 64;

  struct Pair {
    const Value* a;
    const Value* b;
    bool areInside;  // of containers that each lie in an arena
  };

  bool _compareWaiting() {
    while (!_waiting.empty()) {
      const Pair pair = _waiting.back();
      _waiting.pop_back();
      if (!_compare(pair)) return false;
    }
    return true;
  }

  bool _compare(const Pair& pair) {
    const Value& a = *pair.a;
    const Value& b = *pair.b;
    if (a._tag() != b._tag()) return false;
    switch (a._tag()) {
      case Kind::dictionary:
        return _compareEntries(pair);
      case Kind::array:
        return _compareMembers(pair);
      case Kind::string:
        return _compareTexts(a._content.reference._node(), b._content.reference._node());
      case Kind::data:
        return &a._dataNode() == &b._dataNode() ||
               _compareBytes(a._dataNode().data, b._dataNode().data, &a._dataNode(),
                             &b._dataNode());
      default:
        return a._content.bits == b._content.bits;
    }
  }

  bool _compareMembers(const Pair& pair) {
    const auto* const a = pair.a->_content.array._array();
    const auto* const b = pair.b->_content.array._array();
    if (pair.a->_content.array.size() != pair.b->_content.array.size()) return false;
    if (a == b || pair.a->_content.array.empty()) return true;
    if (!_meetFirst(*a, *b, pair.areInside)) return true;
    const bool areInside = a->owner->isArena() && b->owner->isArena();
    for (std::size_t i = 0; i < a->size; ++i)
      _waiting.push_back({a->first + i, b->first + i, areInside});
    return true;
  }

  bool _compareEntries(const Pair& pair) {
    const auto* const a = pair.a->_content.dictionary._dictionary();
    const auto* const b = pair.b->_content.dictionary._dictionary();
    if (pair.a->_content.dictionary.size() != pair.b->_content.dictionary.size()) return false;
    if (a == b || pair.a->_content.dictionary.empty()) return true;
    if (!_meetFirst(*a, *b, pair.areInside)) return true;
    const bool areInside = a->owner->isArena() && b->owner->isArena();
    for (std::size_t i = 0; i < a->size; ++i) {
      const Dictionary::Entry& left = a->first[i];
      const Dictionary::Entry& right = b->first[i];
      if (!_compareTexts(left._value._key(), right._value._key())) return false;
      _waiting.push_back({&left._value, &right._value, areInside});
    }
    return true;
  }

  bool _compareTexts(const storage::Node* a, const storage::Node* b) {
    return a == b || _compareBytes(static_cast<const TextNode*>(a)->text,
                                   static_cast<const TextNode*>(b)->text, a, b);
  }

  template <typename Sequence>
  bool _compareBytes(const Sequence& a, const Sequence& b, const void* left, const void* right) {
    if (a.size() != b.size()) return false;
    if (a.size() > kShort && !_join(left, right)) return true;
    return std::equal(a.begin(), a.end(), b.begin());
  }

  // Whether these two have to be compared: not when they already count as equal. Nodes to which
  // only one place refers meet once at most for each meeting of those places.
  template <typename Node>
  bool _meetFirst(const Node& a, const Node& b, bool areInside) {
    return (_hasOnePlace(a, areInside) && _hasOnePlace(b, areInside)) || _join(&a, &b);
  }

  template <typename Node>
  static bool _hasOnePlace(const Node& node, bool isInside) {
    return node.owner->isArena() ? isInside && !node.isShared : node.owner->isSole();
  }

  // False when they were joined before.
  bool _join(const void* a, const void* b) {
    const void* const left = _representative(a);
    const void* const right = _representative(b);
    if (left == right) return false;
    _joinedTo[left] = right;
    return true;
  }

  // The one of all nodes joined with `node` that stands for them. Shortens the way on the go.
  const void* _representative(const void* node) {
    auto found = _joinedTo.find(node);
    while (found != _joinedTo.end()) {
      const auto next = _joinedTo.find(found->second);
      if (next == _joinedTo.end()) return found->second;
      found->second = next->second;
      node = found->second;
      found = _joinedTo.find(node);
    }
    return node;
  }

  std::vector<Pair> _waiting;
  std::unordered_map<const void*, const void*> _joinedTo;
};

bool operator==(const Value& a, const Value& b) { return Value::Comparison::areEqual(a, b); }
bool operator==(const Array& a, const Array& b) {
  return a.sharesStorageWith(b) || Value(a) == Value(b);
}
bool operator==(const Dictionary& a, const Dictionary& b) {
  return a.sharesStorageWith(b) || Value(a) == Value(b);
}

}  // namespace propertylist
