#pragma once

#include "platform/Export.h"

namespace platform {

// The absolute time. Any thread.
class PLATFORM_EXPORT Clock {
 public:
  virtual ~Clock();
  // Seconds since a fixed instant of the platform's choice; only differences mean something.
  virtual double absoluteTime() = 0;
};

}  // namespace platform
