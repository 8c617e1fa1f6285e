#pragma once

#include "platform/WebEngineThreadLock.h"
#include "platform/testing/FakeService.h"

namespace platform {

// A thread lock that is free at once.
class InMemoryWebEngineThreadLock : public WebEngineThreadLock, public FakeService {
 public:
  bool held = false;

  bool isHeld() override { return !_fails("isHeld", {}) && held; }
  void acquire() override { held = !_fails("acquire", {}) || held; }
};

}  // namespace platform
