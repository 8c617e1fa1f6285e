#pragma once

#include <string>
#include <vector>

#include "platform/SystemLog.h"
#include "tests/contracts/Port.h"

// One empty system log.
class SystemLogUnderTest {
 public:
  virtual ~SystemLogUnderTest() = default;
  virtual platform::SystemLog& service() = 0;
  // The entries as a reader of the log sees them, with what the log adds.
  virtual std::vector<std::string> entries() = 0;
};
using SystemLogPort = Port<SystemLogUnderTest>;
class SystemLogContract : public Contract<SystemLogUnderTest> {};

TEST_P(SystemLogContract, KeepsTheTextsInTheirOrder) {
  const std::vector<std::string> kTexts = {"Checking account %@ of type %s", "caf\xC3\xA9", "100 %",
                                           std::string(100'000, 'x')};
  for (const std::string& text : kTexts) device->service().writeLine(text);
  const std::vector<std::string> entries = device->entries();
  ASSERT_EQ(entries.size(), kTexts.size());
  for (std::size_t i = 0; i < kTexts.size(); ++i) EXPECT_TRUE(entries[i].ends_with(kTexts[i])) << i;
}

TEST_P(SystemLogContract, MakesOneEntryOfEachCallWhateverTheTextHolds) {
  const std::vector<std::string> kTexts = {"first\nforged entry", "a\r\nb", "",
                                           std::string("a\0b", 3), "\xFF\xFE"};
  for (const std::string& text : kTexts) device->service().writeLine(text);
  EXPECT_EQ(device->entries().size(), kTexts.size());
}
