#include "propertylist/ValueCount.h"

#include <algorithm>
#include <unordered_map>
#include <vector>

namespace propertylist {
namespace {

class Counting {
 public:
  explicit Counting(std::uint64_t limit) : _limit(limit) {}

  std::uint64_t of(const Value& value) {
    _open.push_back({nullptr, 1, 0, 0});  // stands around everything and gets the sum
    _look(value);
    while (_open.size() > 1) _continue();
    return _open.front().values;
  }

 private:
  struct Container {
    const void* storage;  // the address of its first member
    std::size_t size;
    std::size_t next;  // the member whose turn it is
    std::uint64_t values;
    const Array* array = nullptr;
    const Dictionary* dictionary = nullptr;
  };

  void _look(const Value& value) {
    const Array* const array = value.asArray();
    const Dictionary* const dictionary = value.asDictionary();
    if (array != nullptr && !array->empty()) {
      _enter({array->begin(), array->size(), 0, 1, array, nullptr});
    } else if (dictionary != nullptr && !dictionary->empty()) {
      _enter({dictionary->begin(), dictionary->size(), 0, 1, nullptr, dictionary});
    } else {
      _add(1);
    }
  }

  void _enter(const Container& container) {
    const auto known = _known.find(container.storage);
    if (known != _known.end()) {
      _add(known->second);
    } else {
      _open.push_back(container);
    }
  }

  void _continue() {
    Container& container = _open.back();
    if (container.next < container.size) {
      const std::size_t index = container.next++;
      _look(container.array != nullptr ? (*container.array)[index]
                                       : container.dictionary->begin()[index].value());
      return;
    }
    const std::uint64_t values = container.values;
    _known.emplace(container.storage, values);
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

}  // namespace

std::uint64_t countValues(const Value& value, std::uint64_t limit) {
  return Counting(limit).of(value);
}

}  // namespace propertylist
