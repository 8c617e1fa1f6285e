#include <stdexcept>

#include "tests/host/bundles/TestMigrator.h"

namespace {

[[noreturn]] void raise() { throw std::runtime_error("not to be stopped"); }

void promisesTooMuch() noexcept { raise(); }

}  // namespace

bool migrate() {
  promisesTooMuch();
  return true;
}
