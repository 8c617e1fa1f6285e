#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "QuillnetAccountTypeRemoval/ASLog.h"
#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

class DiagnosticLogging : public ::testing::Test {
 protected:
  AccountsDevice device;
};

// An object that notes that it was described.
class Witness : public platform::Describable {
 public:
  std::string description() const override {
    ++described;
    return "seen";
  }
  mutable int described = 0;
};

TEST_F(DiagnosticLogging, IsOffWithoutThePreferenceAndWritesNothing) {
  ASLog("line");
  EXPECT_FALSE(getASLoggingEnabled());
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(DiagnosticLogging, IsOnForANumberOtherThanZero) {
  device.preferences.defaults.set("ASLoggingEnabled", 2);
  EXPECT_TRUE(getASLoggingEnabled());
}

TEST_F(DiagnosticLogging, IsOnForAnAffirmativeWord) {
  device.preferences.defaults.set("ASLoggingEnabled", "YES");
  EXPECT_TRUE(getASLoggingEnabled());
}

TEST_F(DiagnosticLogging, IsOffForAnyOtherKindOfValue) {
  device.preferences.defaults.set("ASLoggingEnabled", Array{true});
  EXPECT_FALSE(getASLoggingEnabled());
}

TEST_F(DiagnosticLogging, ReadsTheProcesssOwnDefaultOnceAlsoWhenItWasOn) {
  device.traceVerbosely();
  EXPECT_TRUE(getASLoggingEnabled());
  device.preferences.defaults.set("ASLoggingEnabled", false);
  EXPECT_TRUE(getASLoggingEnabled());
  EXPECT_EQ(device.preferences.calls(), (CallJournal{"readDefault(ASLoggingEnabled)"}));
}

TEST_F(DiagnosticLogging, ReadsItOnceAlsoWhenItWasAbsent) {
  ASLog("line");
  device.traceVerbosely();
  ASLog("line");
  EXPECT_FALSE(getASLoggingEnabled());
  EXPECT_EQ(device.logLines(), Lines());
  EXPECT_EQ(device.preferences.calls(), (CallJournal{"readDefault(ASLoggingEnabled)"}));
}

TEST_F(DiagnosticLogging, DescribesNoArgumentWhileItIsOff) {
  const Witness witness;
  ASLog("%@", witness);
  EXPECT_EQ(witness.described, 0);
}

TEST_F(DiagnosticLogging, WritesExpandedLinesWithoutAPrefixWhileItIsOn) {
  device.traceVerbosely();
  const Witness witness;
  ASLog("%@ %s %d %ld%%", witness, "text", -5, 1L << 40);
  ASLog("%@:%@", std::optional<std::string>("CalDAV"), Dictionary{{"a", 1}}, "not printed");
  ASLog("Inserting account:", Dictionary{{"a", 1}});
  ASLog("%@|%@", AccountPtr(), std::optional<std::string>());
  ASLog("%@", "100%@ %s %n %d");
  EXPECT_EQ(device.logLines(), (Lines{"seen text -5 1099511627776%", "CalDAV:{a = 1}",
                                      "Inserting account:", "(null)|(null)", "100%@ %s %n %d"}));
}

TEST_F(DiagnosticLogging, SystemLogLinesAreWrittenWhileItIsOff) {
  platform::logToSystem("line %d", 1);
  EXPECT_EQ(device.logLines(), (Lines{"line 1"}));
}

// Preferences that two threads may ask at once.
class SharedPreferences : public platform::PreferencesService {
 public:
  std::optional<Value> readDefault(std::string_view) override {
    ++reads;
    return Value(true);
  }
  std::optional<Value> readApplicationPreference(std::string_view, std::string_view) override {
    return std::nullopt;
  }
  void postPreferencesChanged(std::string_view, std::string_view) override {}
  std::atomic<int> reads = 0;
};

TEST_F(DiagnosticLogging, TwoThreadsThatAskFirstTogetherGetTheSameAnswer) {
  SharedPreferences preferences;
  device.use<platform::PreferencesService>(preferences);
  std::atomic<int> yes = 0;
  const auto ask = [&] { yes += getASLoggingEnabled() ? 1 : 0; };
  std::thread first(ask);
  std::thread second(ask);
  first.join();
  second.join();
  EXPECT_EQ(yes, 2);
  EXPECT_GE(preferences.reads, 1);
}

}  // namespace
}  // namespace accountsettings
