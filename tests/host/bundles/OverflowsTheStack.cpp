#include <array>

#include "tests/host/bundles/TestMigrator.h"

namespace {

#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Winfinite-recursion"
int descend(int level) {
  std::array<volatile char, 4096> frame = {};
  frame[static_cast<std::size_t>(level) % frame.size()] = 1;
  return descend(level + 1) + frame[0];
}
#pragma GCC diagnostic pop

}  // namespace

bool migrate() { return descend(0) == 1; }
