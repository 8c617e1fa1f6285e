#include "platform/posix/LinuxProcessTable.h"

#include <linux/sched.h>
#include <sys/syscall.h>

#include <cerrno>
#include <cstdint>
#include <fstream>
#include <string>
#include <thread>

#include "platform/posix/MonotonicClock.h"
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
    for (;;) {
      const auto filled = table.fillTable(table.sizeOfTable().count);
      if (!filled.status.isSuccess()) continue;  // it has grown meanwhile
      for (const auto& listed : filled.processes)
        if (listed.identifier == process) return listed.commandName;
      return {};
    }
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
  const auto processes = table.fillTable(1'000'000).processes;
  EXPECT_TRUE(std::is_sorted(processes.begin(), processes.end(), [](const auto& a, const auto& b) {
    return a.identifier < b.identifier;
  }));
  EXPECT_GE(processes.size(), 1U);
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

// Starts a process that waits in another thread than its first, which has ended.
pid_t startWithoutFirstThread() {
  const pid_t process = ::fork();
  if (process == 0) {
    std::thread([] {
      for (;;) ::pause();
    }).detach();
    ::syscall(SYS_exit, 0);
  }
  const std::string path = "/proc/" + std::to_string(process) + "/stat";
  for (std::string line; line.find(") Z ") == std::string::npos;)
    std::getline(std::ifstream(path), line);
  return process;
}

TEST_F(LinuxProcesses, OfWhichOneThreadIsLeftAreListedAndSignalled) {
  const pid_t process = startWithoutFirstThread();
  const std::filesystem::path program = std::filesystem::read_symlink("/proc/self/exe");
  LinuxProcessTable table(program.parent_path().string());
  EXPECT_EQ(nameOf(table, process), program.filename().string().substr(0, 16));
  EXPECT_EQ(table.sendSignal(process, SIGKILL).code, 0);
  int status = 0;
  ASSERT_EQ(::waitpid(process, &status, 0), process);
  EXPECT_TRUE(WIFSIGNALED(status));
}

// Starts a process that waits, under a number that was another's.
pid_t startWaitingUnder(pid_t number) {
  clone_args arguments = {};
  arguments.exit_signal = SIGCHLD;
  arguments.set_tid = reinterpret_cast<std::uint64_t>(&number);
  arguments.set_tid_size = 1;
  const long process = ::syscall(SYS_clone3, &arguments, sizeof arguments);
  if (process == 0) {
    for (;;) ::pause();
  }
  return static_cast<pid_t>(process);
}

TEST_F(LinuxProcesses, ThatTookANumberOverAreNotSignalled) {
  const pid_t former = started.start(kSleeper, directory.path(), "tallowd", {"1000"});
  // The kernel counts the time of a start in hundredths of a second.
  platform::MonotonicClock clock;
  const double end = clock.absoluteTime() + 0.03;
  LinuxProcessTable table;
  ASSERT_EQ(nameOf(table, former), "tallowd");
  ASSERT_EQ(::kill(former, SIGKILL), 0);
  started.waitForEnd(former);
  while (clock.absoluteTime() < end) std::this_thread::yield();
  const pid_t latter = startWaitingUnder(former);
  if (latter < 0) GTEST_SKIP() << "this user may not choose numbers of processes";
  ASSERT_EQ(latter, former);
  EXPECT_EQ(table.sendSignal(former, SIGKILL).code, ESRCH);
  siginfo_t state = {};
  EXPECT_EQ(::waitid(P_PID, static_cast<id_t>(latter), &state, WEXITED | WNOHANG | WNOWAIT), 0);
  EXPECT_EQ(state.si_pid, 0) << "it has ended";
  ::kill(latter, SIGKILL);
  ::waitpid(latter, nullptr, 0);
}

}  // namespace
