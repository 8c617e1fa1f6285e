// Works for ever and gets nowhere.
#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  for (volatile unsigned turn = 0;;) turn = turn + 1;
}
