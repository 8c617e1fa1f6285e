#pragma once

#include <chrono>

#include "platform/Export.h"

namespace platform {

// The calling thread's run loop.
class PLATFORM_EXPORT RunLoop {
 public:
  virtual ~RunLoop();
  // Runs the loop in its default mode until one of its sources was handled or `slice` has passed.
  virtual void runForAtMost(std::chrono::milliseconds slice) = 0;
};

}  // namespace platform
