#include "tools/account-settings/TimeLimit.h"

#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <cmath>
#include <csignal>
#include <string_view>
#include <utility>

namespace tools {
namespace {

// What the handler needs, made before the timer starts: a handler may not make anything.
struct PreparedEnding {
  int code = 0;
  std::string_view output;
  std::string_view message;
};
PreparedEnding prepared;  // NOLINT(cppcoreguidelines-avoid-non-const-global-variables)

void writeWhole(int descriptor, std::string_view text) {
  while (!text.empty()) {
    const ssize_t count = ::write(descriptor, text.data(), text.size());
    if (count < 0 && errno == EINTR) continue;
    if (count <= 0) return;
    text.remove_prefix(static_cast<std::size_t>(count));
  }
}

// Only what is safe in a signal handler.
void endProcess(int /*signal*/) {
  writeWhole(STDOUT_FILENO, prepared.output);
  writeWhole(STDERR_FILENO, prepared.message);
  ::_exit(prepared.code);
}

void startTimer(double seconds) {
  double whole = 0;
  const double fraction = std::modf(seconds, &whole);
  itimerval timer = {};
  timer.it_value.tv_sec = static_cast<time_t>(whole);
  timer.it_value.tv_usec = static_cast<suseconds_t>(fraction * 1e6);
  ::setitimer(ITIMER_REAL, &timer, nullptr);
}

}  // namespace

TimeLimit::TimeLimit(double seconds, Ending ending) : _ending(std::move(ending)) {
  prepared = {static_cast<int>(_ending.code), _ending.output, _ending.message};
  std::signal(SIGALRM, endProcess);
  sigset_t alarm;  // whoever started this program may have blocked it
  ::sigemptyset(&alarm);
  ::sigaddset(&alarm, SIGALRM);
  ::sigprocmask(SIG_UNBLOCK, &alarm, nullptr);
  startTimer(seconds);
}

TimeLimit::~TimeLimit() { startTimer(0); }

}  // namespace tools
