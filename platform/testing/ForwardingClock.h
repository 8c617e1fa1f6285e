#pragma once

#include "platform/Clock.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingClock : public Clock {
 public:
  explicit ForwardingClock(Clock& next) : _next(next) {}

  double absoluteTime() override { return _next.absoluteTime(); }

 private:
  Clock& _next;
};

}  // namespace platform
