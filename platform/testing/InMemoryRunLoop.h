#pragma once

#include <functional>
#include <string>

#include "platform/RunLoop.h"
#include "platform/testing/FakeService.h"
#include "platform/testing/InMemoryClock.h"

namespace platform {

// A run loop in which time passes at once: each slice moves the clock by its whole length.
class InMemoryRunLoop : public RunLoop, public FakeService {
 public:
  explicit InMemoryRunLoop(InMemoryClock& clock) : _clock(clock) {}
  // Called after each slice, for what happens on the device meanwhile.
  std::function<void()> afterSlice;

  void runForAtMost(std::chrono::milliseconds slice) override {
    if (_fails("runForAtMost", {std::to_string(slice.count()) + " ms"})) return;
    _clock.now += std::chrono::duration<double>(slice).count();
    if (afterSlice) afterSlice();
  }

 private:
  InMemoryClock& _clock;
};

}  // namespace platform
