// A library for LD_PRELOAD that lets allocations fail, counted from the call of beginToFail to that
// of endOfFailing.
//   FAILING_AT=N      the N-th fails (from 1); with FAILING_ON=1 all from there on
//   FAILING_COUNT=F   the numbers of allocations, and of those that failed, are written to the file
//   F
//                     in the end
#include <atomic>
#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <cstdlib>

// What the C library calls its own functions by.
extern "C" void* __libc_malloc(std::size_t size);
extern "C" void* __libc_calloc(std::size_t count, std::size_t size);
extern "C" void* __libc_realloc(void* block, std::size_t size);
extern "C" void* __libc_memalign(std::size_t alignment, std::size_t size);

namespace {

std::atomic<bool> hasBegun = false;
std::atomic<long> count = 0;
std::atomic<long> failures = 0;
long failingAt = 0;
bool failsOn = false;

bool isToFail() {
  if (!hasBegun) return false;
  const long number = ++count;
  if (failingAt == 0 || number < failingAt || (number > failingAt && !failsOn)) return false;
  ++failures;
  errno = ENOMEM;
  return true;
}

struct CountWriter {
  ~CountWriter() {
    hasBegun = false;
    const char* name = std::getenv("FAILING_COUNT");
    std::FILE* file = name != nullptr ? std::fopen(name, "w") : nullptr;
    if (file == nullptr) return;
    std::fprintf(file, "%ld %ld\n", count.load(), failures.load());
    std::fclose(file);
  }
} countWriter;

}  // namespace

#define EXPORTED extern "C" __attribute__((visibility("default")))

EXPORTED void beginToFail() {
  const char* at = std::getenv("FAILING_AT");
  failingAt = at != nullptr ? std::atol(at) : 0;
  failsOn = std::getenv("FAILING_ON") != nullptr;
  hasBegun = true;
}
EXPORTED void endOfFailing() { hasBegun = false; }

EXPORTED void* malloc(std::size_t size) { return isToFail() ? nullptr : __libc_malloc(size); }
EXPORTED void* calloc(std::size_t number, std::size_t size) {
  return isToFail() ? nullptr : __libc_calloc(number, size);
}
EXPORTED void* realloc(void* block, std::size_t size) {
  return isToFail() ? nullptr : __libc_realloc(block, size);
}
EXPORTED void* aligned_alloc(std::size_t alignment, std::size_t size) {
  return isToFail() ? nullptr : __libc_memalign(alignment, size);
}
EXPORTED int posix_memalign(void** block, std::size_t alignment, std::size_t size) {
  *block = isToFail() ? nullptr : __libc_memalign(alignment, size);
  return *block != nullptr ? 0 : ENOMEM;
}
