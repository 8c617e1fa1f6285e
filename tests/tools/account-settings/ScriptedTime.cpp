// A library for LD_PRELOAD with a clock of its own, so that a test says how long a program has
// waited.
//
// The monotonic clock stands still but for pauses: each one takes a second and a half of it, and
// none of the real one. Before it ends the line "pause" goes to the descriptor SCRIPTED_TIME_TELLS,
// and a byte must come from SCRIPTED_TIME_HEARS. A timer of the process is told of as "timer" with
// its seconds, and goes off at once.
#include <sys/syscall.h>
#include <sys/time.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <ctime>

namespace {

constexpr long kBegin = 1000;              // seconds
constexpr long kPauseInHalfSeconds = 3;    // for each pause
constexpr long kHalfSecond = 500'000'000;  // nanoseconds
long halfSeconds = 0;                      // that have gone by

int descriptorIn(const char* variable) {
  const char* number = std::getenv(variable);
  return number != nullptr ? std::atoi(number) : -1;
}

void tell(const char* format, double value) {
  std::array<char, 64> line = {};
  const int size = std::snprintf(line.data(), line.size(), format, value);
  if (::write(descriptorIn("SCRIPTED_TIME_TELLS"), line.data(), static_cast<std::size_t>(size)) !=
      size)
    std::abort();
}

}  // namespace

#define EXPORTED extern "C" __attribute__((visibility("default")))

// No other library is asked: sanitizers want to know the time before they can look up names.
EXPORTED int clock_gettime(clockid_t clock, timespec* time) noexcept {
  if (clock != CLOCK_MONOTONIC) return static_cast<int>(::syscall(SYS_clock_gettime, clock, time));
  time->tv_sec = kBegin + halfSeconds / 2;
  time->tv_nsec = halfSeconds % 2 * kHalfSecond;
  return 0;
}

EXPORTED int nanosleep(const timespec* /*wanted*/, timespec* /*left*/) {
  halfSeconds += kPauseInHalfSeconds;
  tell("pause\n", 0);
  char answer = 0;
  if (::read(descriptorIn("SCRIPTED_TIME_HEARS"), &answer, 1) != 1) std::abort();
  return 0;
}

EXPORTED int setitimer(__itimer_which_t which, const itimerval* wanted,
                       itimerval* before) noexcept {
  itimerval timer = *wanted;
  if (wanted->it_value.tv_sec != 0 || wanted->it_value.tv_usec != 0) {
    tell("timer %g\n", static_cast<double>(wanted->it_value.tv_sec) +
                           static_cast<double>(wanted->it_value.tv_usec) / 1e6);
    timer.it_value = {0, 1};
  }
  return static_cast<int>(::syscall(SYS_setitimer, which, &timer, before));
}
