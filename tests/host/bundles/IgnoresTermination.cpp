// Does its work for ever and ignores the signals that ask a process to end, and so does its child.
#include <unistd.h>

#include <csignal>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  for (const int number : {SIGTERM, SIGINT, SIGHUP, SIGQUIT}) std::signal(number, SIG_IGN);
  const pid_t child = fork();
  if (child != 0) platform::logToSystem("left %d", child);
  for (;;) pause();
}
