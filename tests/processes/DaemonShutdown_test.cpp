// Shutting the data-access daemon down, with daemons that run from the image.
#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <fstream>
#include <string>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "QuillnetAccountTypeRemoval/ProcessLookup.h"
#include "deviceimage/DeviceImageServices.h"
#include "tests/contracts/StartedProcesses.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace accountsettings {
namespace {

using Lines = std::vector<std::string>;

constexpr const char* kAsked = "Performing account migration. Asking tallowd to exit";
constexpr double kFast = 4;
constexpr double kSlow = 0.01;
constexpr const char* kKilled = "tallowd does not seem to want to quit. Sending it a SIGKILL";

// A clock that runs faster than the machine's, so that no test waits for five seconds, or slower,
// so that a daemon has its five seconds on the busiest machine. The slices of the run loop stay as
// long as they are.
class FastClock : public platform::Clock {
 public:
  explicit FastClock(platform::Clock& clock) : _clock(clock) {}
  double absoluteTime() override { return _clock.absoluteTime() * factor; }
  double factor = 1;

 private:
  platform::Clock& _clock;
};

class DaemonOfAnImage : public testing::Test {
 protected:
  DaemonOfAnImage() {
    const platform::Services& real = _services.services();
    platform::install({real.accountFramework, real.bundleResources, real.calendarStore,
                       real.classRegistry, _clock, real.contactsStore, real.deviceInfo,
                       real.exclusiveFileLock, real.fileServices, real.preferences,
                       real.processTable, real.restrictions, real.runLoop, real.syncDataSource,
                       real.systemLog, real.notifyCenter, real.uuidGenerator, real.userDatabase});
  }

  pid_t startDaemon(const std::string& behaviour, const std::string& name = "tallowd") {
    return started.start(DAEMON, image.path("usr/libexec"), name,
                         {behaviour, image.path("var/log/notifications.jsonl")}, true);
  }
  std::size_t countOfNotifications() const {
    std::ifstream file(image.path("var/log/notifications.jsonl"));
    std::size_t count = 0;
    for (std::string line; std::getline(file, line);) ++count;
    return count;
  }

  deviceimage::TemporaryImage image;
  StartedProcesses started;
  Lines logLines;
  FastClock& clock() { return _clock; }
  platform::PollRunLoop& runLoop() { return _services.runLoop(); }

 private:
  deviceimage::ServiceOptions _options() {
    deviceimage::ServiceOptions options;
    options.logSink = [this](std::string_view line) { logLines.emplace_back(line); };
    return options;
  }
  deviceimage::DeviceImageServices _services{image.image, _options()};
  FastClock _clock{_services.services().clock};
};

TEST_F(DaemonOfAnImage, ThatDoesNotRunIsLeftAlone) {
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(logLines, Lines());
  EXPECT_EQ(countOfNotifications(), 0U);
}

TEST_F(DaemonOfAnImage, ThatRunsElsewhereIsLeftAlone) {
  const deviceimage::TemporaryDirectory elsewhere;
  const pid_t other = started.start(DAEMON, elsewhere.path, "tallowd", {"ignores"}, true);
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(logLines, Lines());
  siginfo_t state = {};
  EXPECT_EQ(::waitid(P_PID, static_cast<id_t>(other), &state, WEXITED | WNOHANG | WNOWAIT), 0);
  EXPECT_EQ(state.si_pid, 0) << "it has ended";
}

TEST_F(DaemonOfAnImage, ThatObeysIsAskedAndNotKilled) {
  const pid_t daemon = startDaemon("obeys");
  clock().factor = kSlow;
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(started.waitForEnd(daemon), 0);
  EXPECT_EQ(logLines, (Lines{kAsked}));
  EXPECT_EQ(countOfNotifications(), 1U);
}

TEST_F(DaemonOfAnImage, ThatIgnoresTheNotificationIsKilled) {
  const pid_t daemon = startDaemon("overhears");
  clock().factor = kFast;
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(started.waitForEnd(daemon), SIGKILL);
  EXPECT_EQ(logLines, (Lines{kAsked, kKilled}));
  EXPECT_EQ(countOfNotifications(), 1U);
}

TEST_F(DaemonOfAnImage, ThatIgnoresAllItCanIsKilled) {
  const pid_t daemon = startDaemon("ignores");
  clock().factor = kFast;
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(started.waitForEnd(daemon), SIGKILL);
  EXPECT_EQ(logLines, (Lines{kAsked, kKilled}));
}

TEST_F(DaemonOfAnImage, ThatRestartedIsGone) {
  const pid_t daemon = startDaemon("restarts");
  clock().factor = kSlow;
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(started.waitForEnd(daemon), 0);
  EXPECT_EQ(logLines, (Lines{kAsked}));
  const pid_t restarted = findProcessIDByName("tallowd");
  ASSERT_GT(restarted, 0);
  EXPECT_NE(restarted, daemon);
  EXPECT_EQ(::kill(restarted, SIGKILL), 0);
}

TEST_F(DaemonOfAnImage, IsWaitedForWhileTheCallersSourcesAreServed) {
  startDaemon("ignores");
  clock().factor = kFast;
  int beats = 0;
  runLoop().addTimer(std::chrono::milliseconds(1), [&] { ++beats; });
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_GT(beats, 1);
}

TEST_F(DaemonOfAnImage, IsNotOneWhoseNameOnlyBeginsLikeIt) {
  const pid_t other = startDaemon("ignores", "tallowdtallowdtallowd");
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(logLines, Lines());
  EXPECT_EQ(countOfNotifications(), 0U);
  EXPECT_EQ(findProcessIDByName("tallowdtallowdta"), other);
}

TEST_F(DaemonOfAnImage, IsFoundByTheFirstSixteenBytesOfALongName) {
  const pid_t daemon = startDaemon("ignores", "tallowdtallowdtallowd");
  EXPECT_EQ(findProcessIDByName("tallowdtallowdta"), daemon);
  EXPECT_EQ(findProcessIDByName("tallowdtallowdtaXXX"), daemon);
  EXPECT_EQ(findProcessIDByName("tallowdtallowdt"), -1);
  EXPECT_EQ(findProcessIDByName("tallowd"), -1);
}

}  // namespace
}  // namespace accountsettings
