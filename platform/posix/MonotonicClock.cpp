#include "platform/posix/MonotonicClock.h"

#include <chrono>

namespace platform {

double MonotonicClock::absoluteTime() {
  return std::chrono::duration<double>(std::chrono::steady_clock::now().time_since_epoch()).count();
}

}  // namespace platform
