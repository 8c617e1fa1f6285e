// Writes one line of 300,000 letters.
#include <string>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  platform::logToSystem("%@", std::string(300'000, 'y'));
  return true;
}
