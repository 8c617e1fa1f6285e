#pragma once

#include "platform/Clock.h"

namespace platform {

// A clock that stands still until the test, or an InMemoryRunLoop, moves it.
class InMemoryClock : public Clock {
 public:
  double now = 0;  // seconds

  double absoluteTime() override { return now; }
};

}  // namespace platform
