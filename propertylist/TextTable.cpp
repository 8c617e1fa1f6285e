#include "propertylist/TextTable.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstring>
#include <random>

namespace propertylist {
namespace {

struct Key {
  Key() {
    std::random_device device;
    for (std::uint64_t& word : words) word = std::uint64_t{device()} << 32U | device();
    words[0] |= 1;
  }
  std::array<std::uint64_t, 3> words{};
};

const Key& key() {
  static const Key made;
  return made;
}

// Both halves of the product, folded: each bit of the result depends on all of both factors.
std::uint64_t mixed(std::uint64_t a, std::uint64_t b) {
  __extension__ using Wide = unsigned __int128;
  const Wide product = static_cast<Wide>(a) * b;
  return static_cast<std::uint64_t>(product) ^ static_cast<std::uint64_t>(product >> 64U);
}

template <typename Word>
std::uint64_t wordAt(const char* bytes) {
  Word word = 0;
  std::memcpy(&word, bytes, sizeof word);
  return word;
}

// Up to eight bytes. Those in the middle come twice; with the number of bytes, which is hashed too,
// nothing is lost.
std::uint64_t wordOf(const char* bytes, std::size_t size) {
  constexpr std::size_t kHalf = 4;
  if (size >= kHalf)
    return wordAt<std::uint32_t>(bytes) << 32U | wordAt<std::uint32_t>(bytes + size - kHalf);
  if (size == 0) return 0;
  return wordAt<std::uint8_t>(bytes) << 16U | wordAt<std::uint8_t>(bytes + size / 2) << 8U |
         wordAt<std::uint8_t>(bytes + size - 1);
}

}  // namespace

std::uint64_t TextTable::hashOf(std::uint64_t a, std::uint64_t b) {
  const auto& words = key().words;
  return mixed(mixed(a ^ words[0], b ^ words[1]) ^ words[2], words[0]);
}

std::uint64_t TextTable::hashOf(std::string_view text) {
  constexpr std::size_t kWord = 8;
  const auto& words = key().words;
  std::uint64_t state = words[2] ^ text.size();
  const char* next = text.data();
  std::size_t left = text.size();
  for (; left > 2 * kWord; left -= 2 * kWord, next += 2 * kWord)
    state = mixed(wordAt<std::uint64_t>(next) ^ words[0] ^ state,
                  wordAt<std::uint64_t>(next + kWord) ^ words[1]);
  std::uint64_t first = 0;
  std::uint64_t second = 0;
  if (left > kWord) {
    first = wordAt<std::uint64_t>(next);
    second = wordAt<std::uint64_t>(next + left - kWord);
  } else {
    first = wordOf(next, left);
  }
  return mixed(mixed(first ^ words[0] ^ state, second ^ words[1]), words[2] ^ state);
}

void TextTable::add(std::uint64_t hash, std::size_t index) {
  makeRoomFor(1);
  std::size_t at = hash & _mask;
  while (_slots[at].indexAndOne != 0) at = (at + 1) & _mask;
  _slots[at] = {static_cast<std::uint32_t>(hash), static_cast<std::uint32_t>(index + 1)};
  ++_count;
}

// What lies behind, up to the next free place, moves up unless it would come before where its hash
// puts it: a find looks at no more than before.
void TextTable::remove(std::uint64_t hash, std::size_t index) {
  std::size_t free = hash & _mask;
  while (_slots[free].indexAndOne != index + 1) free = (free + 1) & _mask;
  for (std::size_t at = (free + 1) & _mask; _slots[at].indexAndOne != 0; at = (at + 1) & _mask) {
    const std::size_t first = _slots[at].hash & _mask;
    if (((at - first) & _mask) < ((at - free) & _mask)) continue;
    _slots[free] = _slots[at];
    free = at;
  }
  _slots[free] = {};
  --_count;
}

void TextTable::_grow(std::size_t least) {
  constexpr std::size_t kFirstSize = 64;
  std::vector<Slot> slots(std::max(kFirstSize, std::bit_ceil(least)));
  _mask = slots.size() - 1;
  for (const Slot& slot : _slots) {
    if (slot.indexAndOne == 0) continue;
    std::size_t at = slot.hash & _mask;
    while (slots[at].indexAndOne != 0) at = (at + 1) & _mask;
    slots[at] = slot;
  }
  _slots = std::move(slots);
}

}  // namespace propertylist
