// Waits for ever, whatever signal comes that can be ignored.
#include <unistd.h>

#include <csignal>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  for (int number = 1; number < NSIG; ++number) std::signal(number, SIG_IGN);
  platform::logToSystem("sleeping");
  for (;;) pause();
}
