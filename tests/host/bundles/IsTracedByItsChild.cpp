// Succeeds, but a child in a session of its own traces it, so that its end reaches nobody before
// that child's. The child's number goes to the log.
#include <sys/prctl.h>
#include <sys/ptrace.h>
#include <unistd.h>

#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  int answers[2] = {-1, -1};
  if (pipe(answers) != 0) return false;
  prctl(PR_SET_PTRACER, PR_SET_PTRACER_ANY);
  const pid_t parent = getpid();
  const pid_t child = fork();
  if (child == 0) {
    setsid();
    const bool isTracing = ptrace(PTRACE_SEIZE, parent, nullptr, nullptr) == 0;
    if (write(answers[1], &isTracing, sizeof isTracing) != sizeof isTracing) _exit(1);
    for (;;) pause();
  }
  bool isTracing = false;
  if (read(answers[0], &isTracing, sizeof isTracing) != sizeof isTracing) return false;
  platform::logToSystem("left %d", child);
  return isTracing;
}
