#pragma once

#include "platform/ExclusiveFileLock.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingExclusiveFileLock : public ExclusiveFileLock {
 public:
  explicit ForwardingExclusiveFileLock(ExclusiveFileLock& next) : _next(next) {}

  HeldFileLockPtr lockByName(std::string_view name) override { return _next.lockByName(name); }
  void unlock(const HeldFileLockPtr& lock) override { _next.unlock(lock); }

 private:
  ExclusiveFileLock& _next;
};

}  // namespace platform
