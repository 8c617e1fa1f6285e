#pragma once

#include "platform/WebEngineThreadLock.h"
#include "tests/contracts/Port.h"

// One device with a web engine whose lock the calling thread does not hold.
class WebEngineThreadLockUnderTest {
 public:
  virtual ~WebEngineThreadLockUnderTest() = default;
  virtual platform::WebEngineThreadLock& service() = 0;
};
using WebEngineThreadLockPort = Port<WebEngineThreadLockUnderTest>;
class WebEngineThreadLockContract : public Contract<WebEngineThreadLockUnderTest> {};

TEST_P(WebEngineThreadLockContract, IsHeldOnceItIsAcquired) {
  EXPECT_FALSE(device->service().isHeld());
  device->service().acquire();
  EXPECT_TRUE(device->service().isHeld());
}
