// Writes two log lines and succeeds.
#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  platform::logToSystem("first line of %@", "the test");
  platform::logToSystem("second line\nwith a break", 1);
  return true;
}
