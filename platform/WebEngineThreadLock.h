#pragma once

#include "platform/Export.h"

namespace platform {

// The web engine's global thread lock.
class PLATFORM_EXPORT WebEngineThreadLock {
 public:
  virtual ~WebEngineThreadLock();
  // Whether the calling thread holds the lock.
  virtual bool isHeld() = 0;
  // Waits until the calling thread holds the lock.
  virtual void acquire() = 0;
};

}  // namespace platform
