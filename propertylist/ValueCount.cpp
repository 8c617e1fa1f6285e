#include "propertylist/ValueCount.h"

#include <algorithm>
#include <unordered_map>
#include <vector>

#include "propertylist/Value.h"

namespace propertylist {

// One count. A container to which several places refer is counted once and remembered.
class Value::Counting {
 public:
  explicit Counting(std::uint64_t limit) : _limit(limit) {}

  std::uint64_t of(const Value& value) {
    _open.push_back({nullptr, nullptr, 0, false, false});  // stands around everything
    _look(value, false);
    while (_open.size() > 1) _continue();
    return _open.front().values;
  }

 private:
  struct Container {
    const Value* next;  // the member whose turn it is
    const Value* end;
    std::uint64_t values;
    bool isInArena;
    bool isRemembered;
    const void* node = nullptr;
  };

  void _look(const Value& value, bool isInside) {
    if (value._tag() == Kind::dictionary && !value._content.dictionary.empty()) {
      const auto& node = *value._content.dictionary._dictionary();
      static_assert(sizeof *node.first == sizeof(Value));  // entries are values with their keys
      _enter(node, &node.first->_value, isInside);
    } else if (value._tag() == Kind::array && !value._content.array.empty()) {
      const auto& node = *value._content.array._array();
      _enter(node, node.first, isInside);
    } else {
      _add(1);
    }
  }

  static bool _mayHold(const Value& value) {
    return value._tag() == Kind::dictionary || value._tag() == Kind::array;
  }

  template <typename Node>
  void _enter(const Node& node, const Value* first, bool isInside) {
    const bool isInArena = node.owner->isArena();
    const bool hasOnePlace = isInArena ? isInside && !node.isShared : node.owner->isSole();
    if (!hasOnePlace) {
      const auto known = _known.find(&node);
      if (known != _known.end()) return _add(known->second);
    }
    _open.push_back({first, first + node.size, 1, isInArena, !hasOnePlace, &node});
  }

  void _continue() {
    Container& container = _open.back();
    // Leaves are counted here; what is entered comes back to the next member.
    const Value* const first = container.next;
    container.next = std::find_if(first, container.end, _mayHold);
    _add(static_cast<std::uint64_t>(container.next - first));
    if (container.next != container.end) return _look(*container.next++, container.isInArena);
    const std::uint64_t values = container.values;
    if (container.isRemembered) _known.emplace(container.node, values);
    _open.pop_back();
    _add(values);
  }

  void _add(std::uint64_t values) {
    std::uint64_t& sum = _open.back().values;
    sum = std::min(sum + values, _limit + 1);
  }

  std::uint64_t _limit;
  std::vector<Container> _open;
  std::unordered_map<const void*, std::uint64_t> _known;
};

std::uint64_t countValues(const Value& value, std::uint64_t limit) {
  return Value::Counting(limit).of(value);
}

}  // namespace propertylist
