// Starts a daemon that ignores what can be ignored, and never ends.
#include <unistd.h>

#include <csignal>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  if (fork() == 0) {
    setsid();
    for (int number = 1; number < NSIG; ++number) std::signal(number, SIG_IGN);
    for (;;) pause();
  }
  for (volatile bool spin = true; spin;) {
  }
  return true;
}
