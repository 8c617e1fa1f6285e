// Leaves a process behind that writes to the output for ever: a child of a child in a session of
// its own, as daemons make themselves. Its number goes to the log.
#include <sys/wait.h>
#include <unistd.h>

#include <string>

#include "tests/host/bundles/TestMigrator.h"

namespace {

[[noreturn]] void writeForEver() {
  const std::string block(4096, 'w');
  for (;;)
    if (write(STDOUT_FILENO, block.data(), block.size()) < 0) pause();
}

}  // namespace

bool migrate() {
  int numbers[2] = {-1, -1};
  if (pipe(numbers) != 0) return false;
  const pid_t child = fork();
  if (child == 0) {
    setsid();
    const pid_t daemon = fork();
    if (daemon == 0) writeForEver();
    _exit(write(numbers[1], &daemon, sizeof daemon) == sizeof daemon ? 0 : 1);
  }
  pid_t daemon = 0;
  if (read(numbers[0], &daemon, sizeof daemon) != sizeof daemon) return false;
  waitpid(child, nullptr, 0);
  platform::logToSystem("left %d", daemon);
  return true;
}
