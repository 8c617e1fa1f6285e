#include <cstdio>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  for (;;) std::puts("again");
}
