// Leaves two processes behind: one in its own session, one whose parent has ended. Both hold the
// output and ignore what can be ignored. Their numbers go to the log.
#include <unistd.h>

#include <csignal>

#include "tests/host/bundles/TestMigrator.h"

namespace {

[[noreturn]] void stayForEver() {
  for (int number = 1; number < NSIG; ++number) std::signal(number, SIG_IGN);
  for (;;) pause();
}

}  // namespace

bool migrate() {
  int numbers[2] = {-1, -1};
  if (pipe(numbers) != 0) return false;
  const pid_t first = fork();
  if (first == 0) {
    setsid();
    const pid_t orphan = fork();
    if (orphan == 0) {
      setsid();
      stayForEver();
    }
    if (write(numbers[1], &orphan, sizeof orphan) != sizeof orphan) _exit(1);
    _exit(0);
  }
  pid_t orphan = 0;
  if (read(numbers[0], &orphan, sizeof orphan) != sizeof orphan) return false;
  const pid_t second = fork();
  if (second == 0) {
    setsid();
    stayForEver();
  }
  platform::logToSystem("left %d and %d", orphan, second);
  return true;
}
