// Writes one line of 300,000 letters.
#include <string>

#include "platform/Services.h"
#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  platform::services().systemLog.writeLine(std::string(300'000, 'y'));
  return true;
}
