#pragma once

#include <string>

#include "platform/DeviceInfo.h"
#include "tests/contracts/Port.h"

// One device.
class DeviceInfoUnderTest {
 public:
  virtual ~DeviceInfoUnderTest() = default;
  virtual platform::DeviceInfo& service() = 0;
  virtual void setProperty(const std::string& key, const std::string& value) = 0;
};
using DeviceInfoPort = Port<DeviceInfoUnderTest>;
class DeviceInfoContract : public Contract<DeviceInfoUnderTest> {};

TEST_P(DeviceInfoContract, AnswersPropertiesByTheirKeys) {
  device->setProperty("DeviceClass", "Kallo Slate");
  device->setProperty("CPUArchitecture", "k7");
  EXPECT_EQ(device->service().queryValue("DeviceClass"), "Kallo Slate");
  EXPECT_EQ(device->service().queryValue("CPUArchitecture"), "k7");
}

TEST_P(DeviceInfoContract, HasNoPropertyUnderAnotherKey) {
  device->setProperty("DeviceClass", "Kallo");
  EXPECT_EQ(device->service().queryValue("deviceclass"), std::nullopt);
  EXPECT_EQ(device->service().queryValue(""), std::nullopt);
}

TEST_P(DeviceInfoContract, NamesItsRootByTheWholePath) {
  EXPECT_TRUE(device->service().systemRootDirectory().starts_with("/"));
}
