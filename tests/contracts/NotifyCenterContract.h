#pragma once

#include <string>
#include <vector>

#include "platform/SystemNotifyCenter.h"
#include "tests/contracts/Port.h"

// One device on which nothing was posted.
class NotifyCenterUnderTest {
 public:
  virtual ~NotifyCenterUnderTest() = default;
  virtual platform::SystemNotifyCenter& service() = 0;
  // The names that everybody can hear, in order.
  virtual std::vector<std::string> posted() = 0;
};
using NotifyCenterPort = Port<NotifyCenterUnderTest>;
class NotifyCenterContract : public Contract<NotifyCenterUnderTest> {};

TEST_P(NotifyCenterContract, PostsEachNameInItsTurn) {
  EXPECT_EQ(device->posted(), std::vector<std::string>{});
  const std::vector<std::string> kNames = {"com.vantor.One", "com.vantor.\"Two\"\n",
                                           "com.vantor.One"};
  for (const std::string& name : kNames) device->service().postSystemNotification(name);
  EXPECT_EQ(device->posted(), kNames);
}
