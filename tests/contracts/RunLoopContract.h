#pragma once

#include "platform/Clock.h"
#include "platform/RunLoop.h"
#include "tests/contracts/Port.h"

// One device's run loop and clock.
class RunLoopUnderTest {
 public:
  virtual ~RunLoopUnderTest() = default;
  virtual platform::RunLoop& service() = 0;
  virtual platform::Clock& clock() = 0;
};
using RunLoopPort = Port<RunLoopUnderTest>;
class RunLoopContract : public Contract<RunLoopUnderTest> {};

// A source of the loop may end a slice early, so only the sum of many is certain to move the clock.
TEST_P(RunLoopContract, LetsTimePass) {
  const double start = device->clock().absoluteTime();
  while (device->clock().absoluteTime() < start + 0.05)
    device->service().runForAtMost(std::chrono::milliseconds(10));
  device->service().runForAtMost(std::chrono::milliseconds(0));
}
