// Succeeds and leaves a process in a session of its own that keeps the output open and ignores what
// can be ignored. Its number goes to the log.
#include <unistd.h>

#include <csignal>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  const pid_t child = fork();
  if (child == 0) {
    setsid();
    for (int number = 1; number < NSIG; ++number) std::signal(number, SIG_IGN);
    for (;;) pause();
  }
  platform::logToSystem("left %d", child);
  return true;
}
