// What a store of accounts holds in memory, and the most that a save takes besides: every
// allocation of this process is counted, as large as the allocator made it.
//
// usage: bench-memory ACCOUNTS        prints {"held": BYTES, "peak": BYTES, "binary": BYTES}
#include <malloc.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <new>
#include <stdexcept>
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

void put(const std::string& path, const propertylist::Bytes& bytes) {
  std::ofstream file(path, std::fstream::binary | std::fstream::trunc);
  file.write(reinterpret_cast<const char*>(bytes.data()),
             static_cast<std::streamsize>(bytes.size()));
  if (!file.flush()) throw std::runtime_error("cannot write " + path);
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
  put(path, *propertylist::writeBinaryPropertyList(bench::settings(accounts)));

  const std::size_t before = allocated;
  const auto store = accountsettings::ASSAccountsManager::init();
  const std::size_t held = allocated - before;
  bench::changeSome(*store);
  put(path, elsewhere);
  const std::size_t beforeSaving = allocated;
  most = allocated;
  store->saveAllAccounts();
  const std::size_t peak = held + most - beforeSaving;
  std::printf("{\"held\": %zu, \"peak\": %zu, \"binary\": %zu}\n", held, peak, elsewhere.size());
  return 0;
}
