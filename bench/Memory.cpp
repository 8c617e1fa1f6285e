// What a store of accounts holds in memory when it is loaded, and the most that is held while it
// saves, the changes with it: every allocation of this process is counted, as large as the
// allocator made it.
//
// usage: bench-memory ACCOUNTS        prints {"held": BYTES, "peak": BYTES, "binary": BYTES}
#include <malloc.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <new>
#include <string>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "bench/Accounts.h"
#include "bench/Device.h"
#include "bench/StoreChanges.h"
#include "platform/posix/PosixFileServices.h"
#include "propertylist/Writing.h"

namespace {

constexpr std::size_t kBookkeeping = sizeof(std::size_t);  // of glibc, for each allocation

std::size_t allocated = 0;
std::size_t most = 0;

void* allocate(std::size_t size) {
  void* const memory = std::malloc(size);
  if (memory == nullptr) throw std::bad_alloc();
  allocated += ::malloc_usable_size(memory) + kBookkeeping;
  most = std::max(most, allocated);
  return memory;
}

void release(void* memory) {
  if (memory == nullptr) return;
  allocated -= ::malloc_usable_size(memory) + kBookkeeping;
  std::free(memory);
}

}  // namespace

void* operator new(std::size_t size) { return allocate(size); }
void* operator new[](std::size_t size) { return allocate(size); }
void operator delete(void* memory) noexcept { release(memory); }
void operator delete[](void* memory) noexcept { release(memory); }
void operator delete(void* memory, std::size_t /*size*/) noexcept { release(memory); }
void operator delete[](void* memory, std::size_t /*size*/) noexcept { release(memory); }

int main(int argc, char** argv) {
  const std::size_t accounts = argc == 2 ? std::strtoul(argv[1], nullptr, 10) : 0;
  if (accounts == 0) {
    std::fputs("usage: bench-memory ACCOUNTS\n", stderr);
    return 2;
  }
  // Real files: in memory the file would count as the process's.
  platform::PosixFileServices files;
  bench::device().use(files);
  const std::string path = bench::device().settingsPath();
  const propertylist::Bytes elsewhere = bench::changedElsewhere(accounts);
  bench::writeFile(path, *propertylist::writeBinaryPropertyList(bench::settings(accounts)));

  const std::size_t before = allocated;
  const auto store = accountsettings::ASSAccountsManager::init();
  const std::size_t held = allocated - before;
  bench::changeSome(*store);
  bench::writeFile(path, elsewhere);
  most = allocated;
  store->saveAllAccounts();
  const std::size_t peak = most - before;
  if (!bench::holdsChanges(path)) {
    std::fputs("bench-memory: not saved\n", stderr);
    return 1;
  }
  std::printf("{\"held\": %zu, \"peak\": %zu, \"binary\": %zu}\n", held, peak, elsewhere.size());
  return 0;
}
