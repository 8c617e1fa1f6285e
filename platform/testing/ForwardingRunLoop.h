#pragma once

#include "platform/RunLoop.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingRunLoop : public RunLoop {
 public:
  explicit ForwardingRunLoop(RunLoop& next) : _next(next) {}

  void runForAtMost(std::chrono::milliseconds slice) override { _next.runForAtMost(slice); }

 private:
  RunLoop& _next;
};

}  // namespace platform
