#pragma once

#include <set>
#include <string>

#include "platform/UUIDGenerator.h"
#include "tests/contracts/Port.h"

class UUIDGeneratorUnderTest {
 public:
  virtual ~UUIDGeneratorUnderTest() = default;
  virtual platform::UUIDGenerator& service() = 0;
};
using UUIDGeneratorPort = Port<UUIDGeneratorUnderTest>;
class UUIDGeneratorContract : public Contract<UUIDGeneratorUnderTest> {};

TEST_P(UUIDGeneratorContract, MakesFiveGroupsOfUpperCaseHexadecimalDigits) {
  for (int i = 0; i < 100; ++i) {
    const auto made = device->service().generateUUID();
    ASSERT_TRUE(made.has_value());
    std::string shape = *made;
    for (char& c : shape)
      if (std::string_view("0123456789ABCDEF").find(c) != std::string_view::npos) c = 'x';
    EXPECT_EQ(shape, "xxxxxxxx-xxxx-xxxx-xxxx-xxxxxxxxxxxx") << *made;
  }
}

TEST_P(UUIDGeneratorContract, MakesNoneTwice) {
  std::set<std::string> made;
  for (int i = 0; i < 1000; ++i) made.insert(device->service().generateUUID().value());
  EXPECT_EQ(made.size(), 1000U);
}
