#include "platform/posix/LinuxProcessTable.h"

#include <cerrno>

#include "platform/testing/TemporaryDirectory.h"
#include "tests/contracts/ProcessTableContract.h"
#include "tests/contracts/StartedProcesses.h"

namespace {

using platform::LinuxProcessTable;

constexpr const char* kSleeper = "/bin/sleep";

class MachinesProcesses : public ProcessTableUnderTest {
 public:
  platform::ProcessTable& service() override { return _service; }
  std::optional<pid_t> startProcess(const std::string& commandName) override {
    return _started.start(kSleeper, _directory.path(), commandName, {"1000"});
  }
  bool hasEnded(pid_t process) override { return _started.waitForEnd(process) == SIGKILL; }
  pid_t unusedIdentifier() override { return 1 << 22; }  // the kernel's numbers are below

 private:
  platform::TemporaryDirectory _directory;
  StartedProcesses _started;
  LinuxProcessTable _service;
};
INSTANTIATE_TEST_SUITE_P(Linux, ProcessTableContract,
                         testing::Values(portOf<MachinesProcesses>("Linux")));

class LinuxProcesses : public testing::Test {
 protected:
  // The name under which the table lists the process; empty when it does not.
  static std::string nameOf(LinuxProcessTable& table, pid_t process) {
    for (const auto& listed : table.fillTable(table.sizeOfTable().count).processes)
      if (listed.identifier == process) return listed.commandName;
    return {};
  }

  platform::TemporaryDirectory directory;
  StartedProcesses started;
};

TEST_F(LinuxProcesses, AreNamedByTheFirstSixteenBytesOfTheirExecutable) {
  const pid_t process = started.start(kSleeper, directory.path(), "abcdefghijklmnopq", {"1000"});
  LinuxProcessTable table;
  EXPECT_EQ(nameOf(table, process), "abcdefghijklmnop");
}

TEST_F(LinuxProcesses, KeepTheirNameWhenTheirExecutableIsGone) {
  const pid_t process = started.start(kSleeper, directory.path(), "tallowd", {"1000"});
  std::filesystem::remove(std::filesystem::path(directory.path()) / "tallowd");
  LinuxProcessTable table;
  EXPECT_EQ(nameOf(table, process), "tallowd");
}

TEST_F(LinuxProcesses, ThatEndedAndWaitForTheirParentAreNotListed) {
  const pid_t process = started.start(kSleeper, directory.path(), "tallowd", {"1000"});
  ASSERT_EQ(::kill(process, SIGKILL), 0);
  siginfo_t end = {};
  ASSERT_EQ(::waitid(P_PID, static_cast<id_t>(process), &end, WEXITED | WNOWAIT), 0);
  LinuxProcessTable table;
  EXPECT_EQ(nameOf(table, process), "");
}

TEST_F(LinuxProcesses, CanBeNarrowedToThoseOfOneDirectory) {
  const std::filesystem::path top = directory.path();
  const pid_t inside = started.start(kSleeper, top / "image/usr", "tallowd", {"1000"});
  const pid_t beside = started.start(kSleeper, top / "image2", "tallowd", {"1000"});
  LinuxProcessTable table((top / "image").string());
  EXPECT_EQ(nameOf(table, inside), "tallowd");
  EXPECT_EQ(nameOf(table, beside), "");
}

TEST_F(LinuxProcesses, AreListedInTheOrderOfTheirIdentifiers) {
  LinuxProcessTable table;
  const auto processes = table.fillTable(table.sizeOfTable().count).processes;
  EXPECT_TRUE(std::is_sorted(processes.begin(), processes.end(), [](const auto& a, const auto& b) {
    return a.identifier < b.identifier;
  }));
  EXPECT_GE(processes.size(), 1U);
}

TEST_F(LinuxProcesses, AGroupIsNeverSignalled) {
  LinuxProcessTable table;
  EXPECT_EQ(table.sendSignal(0, SIGKILL).code, ESRCH);
  EXPECT_EQ(table.sendSignal(-1, SIGKILL).code, ESRCH);
}

TEST_F(LinuxProcesses, ASignalThatEndsNothingCanBeSentToo) {
  const pid_t process = started.start(kSleeper, directory.path(), "tallowd", {"1000"});
  LinuxProcessTable table;
  EXPECT_EQ(nameOf(table, process), "tallowd");
  EXPECT_EQ(table.sendSignal(process, 0).code, 0);
  EXPECT_EQ(nameOf(table, process), "tallowd");
}

TEST_F(LinuxProcesses, ThatWereNotListedAreNotSignalled) {
  const pid_t process = started.start(kSleeper, directory.path(), "tallowd", {"1000"});
  LinuxProcessTable table;
  EXPECT_EQ(table.sendSignal(process, SIGKILL).code, ESRCH);
  EXPECT_EQ(nameOf(table, process), "tallowd");
}

}  // namespace
