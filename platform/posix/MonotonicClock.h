#pragma once

#include "platform/Clock.h"

namespace platform {

// Seconds since the machine was started, untouched by changes of the wall clock.
class PLATFORM_EXPORT MonotonicClock : public Clock {
 public:
  double absoluteTime() override;
};

}  // namespace platform
