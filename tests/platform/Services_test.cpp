#include "platform/Services.h"

#include <gtest/gtest.h>

#include <optional>

#include "platform/InternalConsistencyFailure.h"
#include "platform/testing/InMemoryDevice.h"

namespace platform {
namespace {

TEST(Services, RaiseWhenNoneAreInstalled) {
  try {
    services();
    FAIL() << "nothing was raised";
  } catch (const InternalConsistencyFailure& failure) {
    EXPECT_STREQ(failure.what(), "No platform services are installed");
    EXPECT_EQ(failure.sourceFile(), "Services");
    EXPECT_GT(failure.line(), 0);
  }
}

TEST(Services, AreTheOnesThatWereInstalledLast) {
  InMemoryDevice device;
  EXPECT_EQ(&services().systemLog, &device.systemLog);
  EXPECT_EQ(&services().syncDataSource, &device.syncDataSource);
  EXPECT_EQ(services().webEngineThreadLock, nullptr);
  InMemorySystemLog other;
  device.use<SystemLog>(other);
  EXPECT_EQ(&services().systemLog, &other);
  EXPECT_EQ(&services().syncDataSource, &device.syncDataSource);
}

TEST(Services, AreKeptWhenTheGivenValueIsGone) {
  InMemoryDevice device;
  {
    const std::optional<Services> given = services();
    install(*given);
  }
  EXPECT_EQ(&services().clock, &device.clock);
}

TEST(WriteSystemLog, ExpandsTheLineForTheInstalledLog) {
  InMemoryDevice device;
  logToSystem("Checking account %@ of type %s", "100 %@", "Mail", "left over");
  writeSystemLog("done", {});
  EXPECT_EQ(device.logLines(),
            (std::vector<std::string>{"Checking account 100 %@ of type Mail", "done"}));
}

TEST(WriteSystemLog, CutsEachArgumentThatIsTooLong) {
  InMemoryDevice device;
  const std::string longest(1024, 'x');
  const propertylist::Dictionary dictionary{{"k", longest}};
  logToSystem("[%s] is %@ of %@", longest, longest + "y", dictionary);
  EXPECT_EQ(device.logLines(),
            (std::vector<std::string>{"[" + longest + "] is " + longest +
                                      "... of {k = " + longest.substr(5) + "..."}));
}

}  // namespace
}  // namespace platform
