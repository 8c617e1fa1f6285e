#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <functional>
#include <stdexcept>

#include "QuillnetAccountTypeRemoval/ProcessLookup.h"
#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

using platform::Status;

constexpr const char* kAsked = "Performing account migration. Asking tallowd to exit";
constexpr const char* kKilled = "tallowd does not seem to want to quit. Sending it a SIGKILL";
constexpr const char* kGivenUp =
    "tallowd decided it didn't want to play well with others and refused to exit. We're going to "
    "continue with the backup/restore anyway and hope for the best.";
constexpr const char* kNotification =
    "postSystemNotification(com.vantor.Orvette.BackupAgent.WillStart)";
constexpr const char* kPoliteSlice = "runForAtMost(250 ms)";
constexpr const char* kForcedSlice = "runForAtMost(10 ms)";

class ProcessLookup : public ::testing::Test {
 protected:
  AccountsDevice device;
};

TEST_F(ProcessLookup, AsksForTheSizeAndThenForTheTable) {
  device.processTable.processes = {{7, "one"}, {8, "tallowd"}};
  EXPECT_EQ(findProcessIDByName("tallowd"), 8);
  EXPECT_EQ(device.processTable.calls(), (CallJournal{"sizeOfTable()", "fillTable(2)"}));
}

TEST_F(ProcessLookup, TakesTheFirstInTheOrderOfTheTable) {
  device.processTable.processes = {{90, "tallowd"}, {8, "tallowd"}};
  EXPECT_EQ(findProcessIDByName("tallowd"), 90);
}

TEST_F(ProcessLookup, NeverTakesAnIdentifierBelowOne) {
  device.processTable.processes = {{0, "tallowd"}, {-4, "tallowd"}, {1, "tallowd"}};
  EXPECT_EQ(findProcessIDByName("tallowd"), 1);
  device.processTable.processes = {{0, "tallowd"}, {-4, "tallowd"}};
  EXPECT_EQ(findProcessIDByName("tallowd"), -1);
}

TEST_F(ProcessLookup, AShortNameMustMatchWhole) {
  device.processTable.processes = {{5, "tallowd"}, {6, "tallowdx"}};
  EXPECT_EQ(findProcessIDByName("tallow"), -1);
  EXPECT_EQ(findProcessIDByName("tallowdx"), 6);
}

TEST_F(ProcessLookup, ANameOfSixteenBytesOrMoreMatchesByItsFirstSixteen) {
  device.processTable.processes = {{5, "abcdefghijklmno"}, {6, "abcdefghijklmnopq"}};
  EXPECT_EQ(findProcessIDByName("abcdefghijklmnop"), 6);
  EXPECT_EQ(findProcessIDByName("abcdefghijklmnopXYZ"), 6);
  EXPECT_EQ(findProcessIDByName("abcdefghijklmnoX"), -1);
}

TEST_F(ProcessLookup, AFailedQuestionForTheSizeIsTheAnswer) {
  device.processTable.processes = {{5, "tallowd"}};
  device.processTable.failNext("sizeOfTable", Status::failure(-3, "planned"));
  EXPECT_EQ(findProcessIDByName("tallowd"), -3);
  EXPECT_EQ(device.processTable.calls(), (CallJournal{"sizeOfTable()"}));
}

TEST_F(ProcessLookup, ATableThatGrewMeanwhileIsNotAskedForAgain) {
  device.processTable.processes = {{5, "tallowd"}};
  device.processTable.failNext("fillTable", Status::failure(-1, "grown"));
  EXPECT_EQ(findProcessIDByName("tallowd"), -1);
  EXPECT_EQ(device.processTable.calls(), (CallJournal{"sizeOfTable()", "fillTable(1)"}));
}

TEST_F(ProcessLookup, APositiveFailureCodeIsNeverTakenForAProcess) {
  device.processTable.failNext("sizeOfTable", Status::failure(ENOMEM, "planned"));
  EXPECT_EQ(findProcessIDByName("tallowd"), -1);
  device.processTable.failNext("fillTable", Status::failure(ENOMEM, "planned"));
  EXPECT_EQ(findProcessIDByName("tallowd"), -1);
}

class DaemonShutdown : public ::testing::Test {
 protected:
  DaemonShutdown() {
    device.webEngineThreadLock.alsoNoteCallsIn(&device.journal);
    device.use<platform::WebEngineThreadLock>(device.webEngineThreadLock);
    device.processTable.processes = {{1, "init"}, {77, "tallowd"}, {99, "other"}};
  }

  // The calls of the device but the lookups of the process table.
  CallJournal acts() const {
    CallJournal acts;
    for (const std::string& call : device.journal)
      if (call != "sizeOfTable()" && !call.starts_with("fillTable(")) acts.push_back(call);
    return acts;
  }
  std::size_t countOf(const std::string& call) const {
    return static_cast<std::size_t>(std::count(device.journal.begin(), device.journal.end(), call));
  }
  // Does `change` after the slice of that number, counted from 1.
  void afterSlice(int number, std::function<void()> change) {
    device.runLoop.afterSlice = [this, number, change = std::move(change)] {
      if (++_slices == number) change();
    };
  }

  AccountsDevice device;

 private:
  int _slices = 0;
};

TEST_F(DaemonShutdown, WithoutTheDaemonNothingIsSaidOrDone) {
  device.processTable.processes = {{1, "init"}};
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(acts(), (CallJournal{"ownProcessIdentifier()"}));
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(DaemonShutdown, AFailedLookupCountsAsNoDaemon) {
  device.processTable.failNext("fillTable", Status::failure(ENOMEM, "planned"));
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(acts(), (CallJournal{"ownProcessIdentifier()"}));
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(DaemonShutdown, TheDaemonDoesNotShutItselfDown) {
  device.processTable.ownIdentifier = 77;
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(acts(), (CallJournal{"ownProcessIdentifier()"}));
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(DaemonShutdown, ADaemonThatObeysAtOnceCostsNoSlice) {
  device.notifyCenter.listener = [&](std::string_view) { device.processTable.processes.clear(); };
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(acts(), (CallJournal{"ownProcessIdentifier()", kNotification, "isHeld()"}));
  EXPECT_EQ(device.logLines(), (Lines{kAsked}));
}

TEST_F(DaemonShutdown, ADaemonThatExitsAfterASecondGetsNoSignal) {
  afterSlice(4, [&] { device.processTable.processes.clear(); });
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(acts(), (CallJournal{"ownProcessIdentifier()", kNotification, "isHeld()", kPoliteSlice,
                                 kPoliteSlice, kPoliteSlice, kPoliteSlice}));
  EXPECT_EQ(device.logLines(), (Lines{kAsked}));
  EXPECT_EQ(device.clock.now, 1.0);
}

TEST_F(DaemonShutdown, ADaemonThatRestartedUnderAnotherIdentifierIsGone) {
  afterSlice(2, [&] { device.processTable.processes = {{78, "tallowd"}}; });
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(countOf(kPoliteSlice), 2U);
  EXPECT_EQ(device.logLines(), (Lines{kAsked}));
}

TEST_F(DaemonShutdown, AFailedLookupDuringTheWaitCountsAsGone) {
  afterSlice(3,
             [&] { device.processTable.failNext("sizeOfTable", Status::failure(5, "planned")); });
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(countOf(kPoliteSlice), 3U);
  EXPECT_EQ(device.logLines(), (Lines{kAsked}));
}

// 21 slices of a quarter of a second: at 5.0 seconds, after the 20th, the time is not yet up.
TEST_F(DaemonShutdown, ADaemonThatIgnoresTheQuestionIsKilledAfterFiveSeconds) {
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(countOf(kPoliteSlice), 21U);
  EXPECT_EQ(countOf(kForcedSlice), 0U);
  EXPECT_EQ(countOf("sendSignal(77, 9)"), 1U);
  EXPECT_EQ(device.clock.now, 5.25);
  EXPECT_EQ(device.logLines(), (Lines{kAsked, kKilled}));
}

TEST_F(DaemonShutdown, ADaemonThatGoesInTheLastSliceIsStillSaidNotToWantToQuit) {
  afterSlice(21, [&] { device.processTable.processes.clear(); });
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(device.logLines(), (Lines{kAsked, kKilled}));
  EXPECT_EQ(acts().back(), kPoliteSlice);  // no signal, to no number
}

TEST_F(DaemonShutdown, TheSignalGoesToWhoeverHasTheNameWhenTheTimeIsUp) {
  device.processTable.unkillable = {78};
  afterSlice(21, [&] { device.processTable.processes = {{78, "tallowd"}}; });
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(countOf("sendSignal(78, 9)"), 1U);
  EXPECT_EQ(countOf("sendSignal(77, 9)"), 0U);
  EXPECT_EQ(countOf(kForcedSlice), 0U);  // the one that was asked is gone
  EXPECT_EQ(device.logLines(), (Lines{kAsked, kKilled}));
}

TEST_F(DaemonShutdown, ADaemonThatIgnoresEverythingCostsTenSecondsThreeLinesAndOneSignal) {
  device.processTable.unkillable = {77};
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(countOf("sendSignal(77, 9)"), 1U);
  EXPECT_EQ(countOf(kPoliteSlice), 21U);
  EXPECT_NEAR(static_cast<double>(countOf(kForcedSlice)), 501, 1);  // sums of 0.01 are not exact
  EXPECT_NEAR(device.clock.now, 10.26, 0.02);
  EXPECT_EQ(device.logLines(), (Lines{kAsked, kKilled, kGivenUp}));
}

TEST_F(DaemonShutdown, AFailingSignalIsPassedOver) {
  device.processTable.failEvery("sendSignal", Status::failure(EPERM, "planned"));
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(device.logLines(), (Lines{kAsked, kKilled, kGivenUp}));
}

TEST_F(DaemonShutdown, LooksBeforeEverySlice) {
  afterSlice(1, [&] { device.processTable.processes.clear(); });
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(device.journal, (CallJournal{"ownProcessIdentifier()", "sizeOfTable()", "fillTable(3)",
                                         kNotification, "isHeld()", "sizeOfTable()", "fillTable(3)",
                                         kPoliteSlice, "sizeOfTable()", "fillTable(0)"}));
}

TEST_F(DaemonShutdown, SaysWhatItIsAboutToDo) {
  Lines whenAsked;
  Lines whenKilled;
  device.notifyCenter.listener = [&](std::string_view) { whenAsked = device.logLines(); };
  device.processTable.decideBy([&](const std::string& call) {
    if (call.starts_with("sendSignal(")) whenKilled = device.logLines();
    return std::nullopt;
  });
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(whenAsked, (Lines{kAsked}));
  EXPECT_EQ(whenKilled, (Lines{kAsked, kKilled}));
}

TEST_F(DaemonShutdown, AWebLockThatWasHeldIsTakenAgainAlsoWhenASourceOfTheLoopThrows) {
  device.webEngineThreadLock.held = true;
  afterSlice(1, [] { throw std::runtime_error("a source of the caller"); });
  EXPECT_THROW(ASSAccountsManager::killDataAccessIfNecessary(), std::runtime_error);
  EXPECT_EQ(device.webEngineThreadLock.calls(), (CallJournal{"isHeld()", "acquire()"}));
}

TEST_F(DaemonShutdown, AWebLockThatWasHeldIsTakenAgainOnceAtTheEnd) {
  device.webEngineThreadLock.held = true;
  afterSlice(1, [&] { device.processTable.processes.clear(); });
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(device.webEngineThreadLock.calls(), (CallJournal{"isHeld()", "acquire()"}));
  EXPECT_EQ(acts().back(), "acquire()");
}

TEST_F(DaemonShutdown, AWebLockThatWasHeldIsTakenAgainAlsoWhenTheDaemonStays) {
  device.webEngineThreadLock.held = true;
  device.processTable.unkillable = {77};
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(device.webEngineThreadLock.calls(), (CallJournal{"isHeld()", "acquire()"}));
}

TEST_F(DaemonShutdown, AWebLockThatWasFreeIsNeverTaken) {
  device.processTable.unkillable = {77};
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(device.webEngineThreadLock.calls(), (CallJournal{"isHeld()"}));
}

TEST(DaemonShutdownWithoutAWebEngine, DoesTheSameWithoutItsLock) {
  AccountsDevice device;
  device.processTable.processes = {{77, "tallowd"}};
  ASSAccountsManager::killDataAccessIfNecessary();
  EXPECT_EQ(device.webEngineThreadLock.calls(), CallJournal());
  EXPECT_EQ(device.logLines(), (Lines{kAsked, kKilled}));
}

}  // namespace
}  // namespace accountsettings
