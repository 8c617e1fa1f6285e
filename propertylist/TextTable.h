#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <vector>

#include "propertylist/Export.h"

namespace propertylist {

// Finds what was seen before by its content: the caller keeps the contents in a list, and the table
// their indexes. The hash has a key that is chosen at random for each process, so that whoever
// writes a file cannot choose contents that collide.
class PROPERTYLIST_EXPORT TextTable {
 public:
  static constexpr std::size_t kNone = ~std::size_t{0};

  static std::uint64_t hashOf(std::string_view text);
  // Of up to two numbers.
  static std::uint64_t hashOf(std::uint64_t a, std::uint64_t b);

  // The index of what has this hash and is the same; kNone when there is none.
  template <typename IsSame>
  std::size_t find(std::uint64_t hash, const IsSame& isSame) const {
    if (_slots.empty()) return kNone;
    for (std::size_t at = hash & _mask;; at = (at + 1) & _mask) {
      const Slot& slot = _slots[at];
      if (slot.indexAndOne == 0) return kNone;
      if (slot.hash == static_cast<std::uint32_t>(hash) && isSame(slot.indexAndOne - 1))
        return slot.indexAndOne - 1;
    }
  }
  // Has the memory that a find with this hash looks at come nearer meanwhile. Room has been made.
  void prefetch(std::uint64_t hash) const { __builtin_prefetch(&_slots[hash & _mask]); }
  // Adds what find did not find. `index` is less than 2^32 - 1.
  void add(std::uint64_t hash, std::size_t index);
  // Takes out what was added with this hash and index.
  void remove(std::uint64_t hash, std::size_t index);
  // After this so many more can be added, and nothing fails.
  void makeRoomFor(std::size_t more) {
    if (2 * (_count + more) > _slots.size()) _grow(2 * (_count + more));
  }

 private:
  struct Slot {
    std::uint32_t hash = 0;  // the lower half, which is a place in a table of any size too
    std::uint32_t indexAndOne = 0;
  };
  void _grow(std::size_t least);
  std::vector<Slot> _slots;  // a power of two, at most half full
  std::size_t _mask = 0;
  std::size_t _count = 0;
};

}  // namespace propertylist
