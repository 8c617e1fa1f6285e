#pragma once

#include "platform/Clock.h"
#include "tests/contracts/Port.h"

class ClockUnderTest {
 public:
  virtual ~ClockUnderTest() = default;
  virtual platform::Clock& service() = 0;
};
using ClockPort = Port<ClockUnderTest>;
class ClockContract : public Contract<ClockUnderTest> {};

TEST_P(ClockContract, NeverGoesBack) {
  double last = device->service().absoluteTime();
  for (int i = 0; i < 1000; ++i) {
    const double now = device->service().absoluteTime();
    EXPECT_GE(now, last);
    last = now;
  }
}
