#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#if __has_include(<sys/single_threaded.h>)
#include <sys/single_threaded.h>
#endif

// Where values keep what does not fit into them. Every text, data, array and dictionary has a node,
// and every node an owner: whoever counts the values that refer to it from outside. A node that was
// made alone is its own owner; the nodes of a file that was read have one owner together, the arena
// that they lie in, and refer to one another without being counted.
namespace propertylist::storage {

// Whether nobody else can count at the same time. Where the C library does not tell, somebody can.
inline bool isOnlyThread() noexcept {
#if __has_include(<sys/single_threaded.h>)
  return __libc_single_threaded != 0;
#else
  return false;
#endif
}

// NOLINTNEXTLINE(cppcoreguidelines-virtual-class-destructor): goes with its last reference
class Owner {
 public:
  Owner(const Owner&) = delete;
  Owner& operator=(const Owner&) = delete;

  void retain() noexcept {
    if (isOnlyThread()) {
      _count.store(_count.load(std::memory_order_relaxed) + 1, std::memory_order_relaxed);
    } else {
      _count.fetch_add(1, std::memory_order_relaxed);
    }
  }
  // Destroys this object when it was the last reference.
  void release() noexcept {
    if (isOnlyThread()) {
      const std::size_t count = _count.load(std::memory_order_relaxed) - 1;
      _count.store(count, std::memory_order_relaxed);
      if (count == 0) _destroy();
    } else if (_count.fetch_sub(1, std::memory_order_acq_rel) == 1) {
      _destroy();
    }
  }
  // Whether this owns many nodes, none of which ever changes.
  bool isArena() const noexcept { return _isArena; }
  // Whether nobody else refers to what this owns. What other owners did before they let go has then
  // happened before what the caller does next.
  bool isSole() const noexcept { return _count.load(std::memory_order_acquire) == 1; }

 protected:
  // With one reference.
  explicit Owner(bool isArena) : _isArena(isArena) {}
  virtual ~Owner() = default;

 private:
  virtual void _destroy() noexcept { delete this; }
  std::atomic<std::size_t> _count = 1;
  const bool _isArena;
};

struct Node {
  explicit Node(Owner* o) : owner(o) {}
  Owner* owner;
};

// A value keeps its node's address where a number keeps its bits, and as a number too: so whatever
// a value is read as, it is the same kind of memory.
inline Node* nodeOf(std::uint64_t bits) {
  // NOLINTNEXTLINE(performance-no-int-to-ptr): see above
  return reinterpret_cast<Node*>(static_cast<std::uintptr_t>(bits));
}
inline std::uint64_t bitsOf(const Node* node) { return reinterpret_cast<std::uintptr_t>(node); }

}  // namespace propertylist::storage
