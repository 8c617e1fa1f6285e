#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  for (;;) platform::logToSystem("again");
}
