#include "platform/posix/PollRunLoop.h"

#include <sys/time.h>
#include <unistd.h>

#include <csignal>
#include <memory>
#include <string>
#include <thread>

#include "platform/posix/MonotonicClock.h"
#include "tests/contracts/RunLoopContract.h"

namespace {

using platform::PollRunLoop;
using std::chrono::milliseconds;

// Far longer than any of these tests may take: a loop that waits for it fails at its time limit.
constexpr milliseconds kForever(3'600'000);

class PollingLoop : public RunLoopUnderTest {
 public:
  platform::RunLoop& service() override { return _loop; }
  platform::Clock& clock() override { return _clock; }

 private:
  PollRunLoop _loop;
  platform::MonotonicClock _clock;
};
INSTANTIATE_TEST_SUITE_P(Posix, RunLoopContract, testing::Values(portOf<PollingLoop>("Posix")));

class RunLoopSources : public testing::Test {
 protected:
  RunLoopSources() { EXPECT_EQ(::pipe(_ends), 0); }
  ~RunLoopSources() override {
    ::close(_ends[0]);
    ::close(_ends[1]);
  }
  int descriptor() const { return _ends[0]; }
  void write() { EXPECT_EQ(::write(_ends[1], "x", 1), 1); }
  void read() {
    char byte = 0;
    EXPECT_EQ(::read(_ends[0], &byte, 1), 1);
  }

  PollRunLoop loop;

 private:
  int _ends[2] = {};
};

TEST_F(RunLoopSources, ADescriptorThatCanBeReadEndsTheSlice) {
  int served = 0;
  loop.addDescriptor(descriptor(), [&] {
    read();
    ++served;
  });
  write();
  loop.runForAtMost(kForever);
  EXPECT_EQ(served, 1);
  loop.runForAtMost(milliseconds(1));
  EXPECT_EQ(served, 1);
}

TEST_F(RunLoopSources, ATimerEndsTheSliceEachTimeItsIntervalHasPassed) {
  int beats = 0;
  loop.addTimer(milliseconds(1), [&] { ++beats; });
  loop.runForAtMost(kForever);
  loop.runForAtMost(kForever);
  EXPECT_EQ(beats, 2);
}

TEST_F(RunLoopSources, OneSliceServesOneSource) {
  int served = 0;
  loop.addDescriptor(descriptor(), [&] { ++served; });
  loop.addDescriptor(descriptor(), [&] { ++served; });
  write();
  loop.runForAtMost(kForever);
  EXPECT_EQ(served, 1);
}

TEST_F(RunLoopSources, TakeTurns) {
  std::string served;
  loop.addDescriptor(descriptor(), [&] { served += "a"; });
  loop.addDescriptor(descriptor(), [&] { served += "b"; });
  write();
  for (int i = 0; i < 4; ++i) loop.runForAtMost(kForever);
  EXPECT_EQ(served, "abab");
}

TEST_F(RunLoopSources, ARemovedSourceIsNotServed) {
  int served = 0;
  const PollRunLoop::Source source = loop.addDescriptor(descriptor(), [&] { ++served; });
  write();
  loop.remove(source);
  loop.remove(source);
  loop.runForAtMost(milliseconds(1));
  EXPECT_EQ(served, 0);
}

TEST_F(RunLoopSources, AHandlerMayRemoveItself) {
  int served = 0;
  PollRunLoop::Source source = 0;
  source = loop.addDescriptor(descriptor(), [&] {
    ++served;
    loop.remove(source);
  });
  write();
  loop.runForAtMost(kForever);
  loop.runForAtMost(milliseconds(1));
  EXPECT_EQ(served, 1);
}

TEST_F(RunLoopSources, WithoutAnyTheSliceLastsItsWholeLength) {
  platform::MonotonicClock clock;
  const double start = clock.absoluteTime();
  loop.runForAtMost(milliseconds(30));
  EXPECT_GE(clock.absoluteTime() - start, 0.03);
}

TEST_F(RunLoopSources, ASignalDoesNotEndTheSlice) {
  struct sigaction action = {};
  action.sa_handler = [](int) {};
  ASSERT_EQ(::sigaction(SIGALRM, &action, nullptr), 0);
  const itimerval often = {{0, 1000}, {0, 1000}};
  ASSERT_EQ(::setitimer(ITIMER_REAL, &often, nullptr), 0);
  platform::MonotonicClock clock;
  const double start = clock.absoluteTime();
  loop.runForAtMost(milliseconds(30));
  EXPECT_GE(clock.absoluteTime() - start, 0.03);
}

TEST_F(RunLoopSources, AHandlersEndMayRemoveAnotherSource) {
  const PollRunLoop::Source other = loop.addDescriptor(descriptor(), [] {});
  std::shared_ptr<void> atItsEnd(nullptr, [&](void*) { loop.remove(other); });
  const PollRunLoop::Source source = loop.addDescriptor(descriptor(), [atItsEnd] {});
  atItsEnd.reset();
  loop.remove(source);
  write();
  loop.runForAtMost(milliseconds(1));  // nobody is left to be served
}

TEST_F(RunLoopSources, AnotherThreadsSourcesAreNotServed) {
  int served = 0;
  loop.addDescriptor(descriptor(), [&] { ++served; });
  write();
  std::thread([&] { loop.runForAtMost(milliseconds(1)); }).join();
  EXPECT_EQ(served, 0);
}

}  // namespace
