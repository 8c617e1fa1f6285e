#pragma once

#include <algorithm>
#include <optional>
#include <string>
#include <vector>

#include "platform/ProcessTable.h"
#include "tests/contracts/Port.h"

// One device with its processes.
class ProcessTableUnderTest {
 public:
  virtual ~ProcessTableUnderTest() = default;
  virtual platform::ProcessTable& service() = 0;
  // Starts a process that runs until it is ended; empty when the device cannot have processes.
  virtual std::optional<pid_t> startProcess(const std::string& commandName) = 0;
  // Whether the process is gone once the signals that were sent have taken effect.
  virtual bool hasEnded(pid_t process) = 0;
  // An identifier that no process has.
  virtual pid_t unusedIdentifier() = 0;
};
using ProcessTablePort = Port<ProcessTableUnderTest>;

class ProcessTableContract : public Contract<ProcessTableUnderTest> {
 protected:
  platform::ProcessTable& service() { return device->service(); }
  // The table as a caller reads it: asks again when it has grown meanwhile.
  std::vector<platform::ProcessTable::Process> table() {
    for (;;) {
      const auto sized = service().sizeOfTable();
      EXPECT_TRUE(sized.status.isSuccess());
      const auto filled = service().fillTable(sized.count);
      if (filled.status.isSuccess()) return filled.processes;
    }
  }
};

TEST_P(ProcessTableContract, ListsAProcessByItsNameUntilItIsKilled) {
  const auto started = device->startProcess("tallowd");
  if (!started) GTEST_SKIP() << "this device has no processes";
  const auto isIt = [&](const auto& process) { return process.identifier == *started; };
  const auto before = table();
  const auto found = std::find_if(before.begin(), before.end(), isIt);
  ASSERT_NE(found, before.end());
  EXPECT_EQ(found->commandName, "tallowd");
  EXPECT_TRUE(service().sendSignal(*started, 9).isSuccess());
  EXPECT_TRUE(device->hasEnded(*started));
  const auto after = table();
  EXPECT_EQ(std::find_if(after.begin(), after.end(), isIt), after.end());
}

TEST_P(ProcessTableContract, DoesNotFillATableThatIsTooSmall) {
  if (!device->startProcess("tallowd")) GTEST_SKIP() << "this device has no processes";
  const auto filled = service().fillTable(0);
  EXPECT_FALSE(filled.status.isSuccess());
  EXPECT_TRUE(filled.processes.empty());
}

TEST_P(ProcessTableContract, KnowsItsOwnProcess) {
  const pid_t own = service().ownProcessIdentifier();
  EXPECT_GT(own, 0);
  EXPECT_EQ(service().ownProcessIdentifier(), own);
}

TEST_P(ProcessTableContract, FailsToSignalAProcessThatIsNotThere) {
  EXPECT_FALSE(service().sendSignal(device->unusedIdentifier(), 9).isSuccess());
}

TEST_P(ProcessTableContract, NeverSignalsAGroup) {
  EXPECT_FALSE(service().sendSignal(0, 0).isSuccess());
  EXPECT_FALSE(service().sendSignal(-1, 0).isSuccess());
}
