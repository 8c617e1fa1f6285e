// A daemon for the tests: does what its first argument says, all but the last after saying
// "." to whoever started it.
//   obeys FILE      ends once the file names the notification
//   restarts FILE   leaves the work to a new process at that moment
//   overhears       does nothing but stay, and obeys signals
//   ignores         does nothing but stay, and lets no signal end it that can be kept from it
//   lasts           does nothing but stay, for a minute at most
#include <signal.h>
#include <sys/prctl.h>
#include <unistd.h>

#include <chrono>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>

namespace {

bool wasAskedToExit(const char* file) {
  std::ifstream stream(file);
  const std::string content{std::istreambuf_iterator<char>(stream), {}};
  return content.find("com.vantor.Orvette.BackupAgent.WillStart") != std::string::npos;
}

[[noreturn]] void stay() {
  sigset_t all;
  sigfillset(&all);
  sigprocmask(SIG_BLOCK, &all, nullptr);
  for (;;) ::pause();
}

}  // namespace

int main(int count, char** arguments) {
  if (count < 2) return 2;
  const std::string behaviour = arguments[1];
  // Nobody waits for this one, and the daemon that started it may not have ended yet, so that it
  // must not share its end.
  if (behaviour == "lasts") {
    ::alarm(60);
    for (;;) ::pause();
  }
  // Not longer than the test, which may be killed.
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);
  if (::write(STDOUT_FILENO, ".", 1) != 1) return 1;
  if (behaviour == "ignores") stay();
  if (behaviour == "overhears")
    for (;;) ::pause();
  if (count < 3) return 2;
  while (!wasAskedToExit(arguments[2])) std::this_thread::sleep_for(std::chrono::milliseconds(10));
  if (behaviour == "restarts" && ::fork() == 0) {
    ::execl("/proc/self/exe", arguments[0], "lasts", nullptr);
    return 1;
  }
  return 0;
}
