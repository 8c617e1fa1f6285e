#pragma once

#include "platform/WebEngineThreadLock.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingWebEngineThreadLock : public WebEngineThreadLock {
 public:
  explicit ForwardingWebEngineThreadLock(WebEngineThreadLock& next) : _next(next) {}

  bool isHeld() override { return _next.isHeld(); }
  void acquire() override { _next.acquire(); }

 private:
  WebEngineThreadLock& _next;
};

}  // namespace platform
