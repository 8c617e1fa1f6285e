// Bundles among an image's services that are broken: a save is written and whole whatever they do.

#include <csignal>

#include "tests/accountservices/ServicesImage.h"

namespace accountservices {
namespace {

// An account whose change is told to the faulty notifier.
class FaultyBundle : public ServicesTest {
 protected:
  void useFaultyNotifier(const std::string& className) {
    image.addBundle("Faulty.so", FAULTY_NOTIFIERS);
    image.addNotifier("Faulty.so", className);
  }
  std::shared_ptr<ASSAccountsManager> renamedStore() const {
    auto store = storeOf({account("1", "CalDAV", kCalendars)});
    speak();
    rename(*store, "1");
    return store;
  }
  void expectTheFileIsWrittenAndWhole() const {
    EXPECT_EQ(image.savedAccounts(),
              Array{account("1", "CalDAV", kCalendars, {{"DisplayName", "new"}})});
    EXPECT_EQ(image.leftovers(), Lines{});
  }
};

TEST_F(FaultyBundle, WithAnUnresolvedSymbolIsNotLoaded) {
  image.addBundle("Faulty.so", UNRESOLVED_BUNDLE);
  image.addNotifier("Faulty.so", "AnyNotifier");
  const auto store = renamedStore();
  try {
    store->saveAllAccounts();
    ADD_FAILURE() << "nothing was raised";
  } catch (const platform::InternalConsistencyFailure& failure) {
    const std::string path = image.bundlePath("Faulty.so");
    EXPECT_THAT(failure.what(),
                testing::StartsWith("Could not load the account creator framework " + path +
                                    ". Error " + path + ": undefined symbol: "));
    EXPECT_THAT(failure.what(), testing::HasSubstr("a_function_that_nobody_defines"));
    EXPECT_EQ(failure.line(), 834);
  }
  expectTheFileIsWrittenAndWhole();
}

TEST_F(FaultyBundle, ThatRegistersNothingHasNoClass) {
  image.addBundle("Faulty.so", REGISTERS_NOTHING);
  image.addNotifier("Faulty.so", "AnyNotifier");
  const auto store = renamedStore();
  try {
    store->saveAllAccounts();
    ADD_FAILURE() << "nothing was raised";
  } catch (const platform::InternalConsistencyFailure& failure) {
    EXPECT_STREQ(failure.what(), "Could not find a class for class name AnyNotifier");
    EXPECT_EQ(failure.line(), 992);
  }
  expectTheFileIsWrittenAndWhole();
}

TEST_F(FaultyBundle, ThatRegistersNothingMakesNoAccount) {
  image.addBundle("Faulty.so", REGISTERS_NOTHING);
  for (const char* kind : {"FullAccount", "SyncAccount"})
    image.addEntry("CalDAV", {{"Type", kind},
                              {"Description",
                               Dictionary{{"Framework", "System/Library/AccountServices/Faulty.so"},
                                          {"Class", "AnyCreator"}}}});
  const AccountPtr record =
      accountsettings::ASSBasicAccount::initWithProperties(account("1", "CalDAV"));
  expectFailure("The framework/bundle where AnyCreator is defined has not been loaded",
                [&] { record->fullAccountUsingLoader(nullptr); });
  EXPECT_FALSE(record->refreshContainersForDataclass(kCalendars));
  const Lines log = image.journal("var/log/system.log");
  ASSERT_EQ(log.size(), 1U);
  EXPECT_THAT(log[0], testing::EndsWith(
                          "ERROR: The framework/bundle where AnyCreator is defined has not been "
                          "loaded, so there is no syncable account for basic account with "
                          "properties {Class = C; Identifier = 1; Type = CalDAV}"));
}

TEST_F(FaultyBundle, WhoseNotifierRaisesPassesItOnAndIsToldAgain) {
  useFaultyNotifier("RaisingNotifier");
  const auto store = renamedStore();
  expectFailure("the notifier is broken", [&] { store->saveAllAccounts(); });
  expectTheFileIsWrittenAndWhole();
  EXPECT_EQ(image.changes().size(), 1U);
  // What was not told to everybody still counts as a change.
  expectFailure("the notifier is broken", [&] { store->saveAllAccounts(); });
  EXPECT_EQ(image.changes().size(), 2U);
  expectTheFileIsWrittenAndWhole();
}

TEST_F(FaultyBundle, WhoseNotifierAbortsLeavesTheFileWritten) {
  useFaultyNotifier("AbortingNotifier");
  EXPECT_EXIT(renamedStore()->saveAllAccounts(), testing::KilledBySignal(SIGABRT), "");
  expectTheFileIsWrittenAndWhole();
}

TEST_F(FaultyBundle, WhoseNotifierIsKilledLeavesTheFileWritten) {
  useFaultyNotifier("KilledNotifier");
  EXPECT_EXIT(renamedStore()->saveAllAccounts(), testing::KilledBySignal(SIGKILL), "");
  expectTheFileIsWrittenAndWhole();
}

}  // namespace
}  // namespace accountservices
