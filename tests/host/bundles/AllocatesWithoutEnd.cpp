#include "tests/host/bundles/TestMigrator.h"

namespace {

char* volatile lastBlock = nullptr;  // so that no compiler leaves the allocations out

}  // namespace

bool migrate() {
  constexpr std::size_t kBlock = std::size_t{64} << 20U;
  for (;;) {
    lastBlock = new char[kBlock];
    lastBlock[kBlock - 1] =
        'x';  // the pages between stay untouched: address space is what runs out
  }
}
