// Logs what it finds around itself.
#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>

#include "tests/host/bundles/TestMigrator.h"

namespace {

int countOfDescriptors() {
  int count = 0;
  DIR* directory = opendir("/proc/self/fd");
  while (readdir(directory) != nullptr) ++count;
  closedir(directory);
  return count - 3;  // ".", ".." and the directory itself
}

bool isAnySignalHeldBack() {
  sigset_t mask;
  sigprocmask(SIG_SETMASK, nullptr, &mask);
  return sigismember(&mask, SIGINT) == 1 || sigismember(&mask, SIGTERM) == 1;
}

// Whether a process that is started from here still holds the descriptor with the image's lock.
bool doesAChildHoldTheLock() {
  const pid_t child = fork();
  if (child == 0) _exit(fcntl(4, F_GETFD) >= 0 ? 1 : 0);
  int status = -1;
  waitpid(child, &status, 0);
  return status != 0;
}

}  // namespace

bool migrate() {
  const mode_t mask = umask(0);
  for (char** variable = environ; *variable != nullptr; ++variable)
    platform::logToSystem("%@", *variable);
  platform::logToSystem("umask=%d", static_cast<int>(mask));
  platform::logToSystem("leads its session: %d", getsid(0) == getpid() ? 1 : 0);
  platform::logToSystem("few descriptors: %d", countOfDescriptors() <= 8 ? 1 : 0);
  platform::logToSystem("signals held back: %d", isAnySignalHeldBack() ? 1 : 0);
  platform::logToSystem("a child holds the lock: %d", doesAChildHoldTheLock() ? 1 : 0);
  return true;
}
