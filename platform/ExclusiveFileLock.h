#pragma once

#include <memory>
#include <string_view>

#include "platform/Export.h"

namespace platform {

// A lock that is held. The platform's own object.
class PLATFORM_EXPORT HeldFileLock {
 public:
  virtual ~HeldFileLock();
};
using HeldFileLockPtr = std::shared_ptr<HeldFileLock>;

// Named locks between processes. Two lock objects of one name exclude each other also within one
// process. A lock whose holder ends is free again.
class PLATFORM_EXPORT ExclusiveFileLock {
 public:
  virtual ~ExclusiveFileLock();
  // Waits until the lock named `name` is held, however long; empty when it cannot be made.
  virtual HeldFileLockPtr lockByName(std::string_view name) = 0;
  // Frees the lock. Unlocking twice, or an empty lock, does nothing.
  virtual void unlock(const HeldFileLockPtr& lock) = 0;
};

}  // namespace platform
