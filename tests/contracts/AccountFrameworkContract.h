#pragma once

#include <string>

#include "platform/AccountFramework.h"
#include "tests/contracts/Port.h"

class AccountFrameworkUnderTest {
 public:
  virtual ~AccountFrameworkUnderTest() = default;
  virtual platform::AccountFramework& service() = 0;
};
using AccountFrameworkPort = Port<AccountFrameworkUnderTest>;
class AccountFrameworkContract : public Contract<AccountFrameworkUnderTest> {};

TEST_P(AccountFrameworkContract, NamesOnePropertyEveryTime) {
  const std::string key = device->service().QuillnetStatusKey();
  EXPECT_NE(key, "");
  EXPECT_EQ(device->service().QuillnetStatusKey(), key);
}
