#include <cstring>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  constexpr std::size_t kBlock = std::size_t{64} << 20U;
  for (;;) {
    char* block = new char[kBlock];
    block[kBlock - 1] = 'x';  // the pages between stay untouched: address space is what runs out
  }
}
