#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr const char* kMail = "com.vantor.Dataclass.Mail";
constexpr const char* kContacts = "com.vantor.Dataclass.Contacts";
constexpr const char* kNotes = "com.vantor.Dataclass.Notes";
constexpr const char* kUnknown = "com.vantor.Dataclass.Faxes";

class TypeCatalogue : public ::testing::Test {
 protected:
  // Replaces the catalogue by one type "T" with this list of supported dataclasses.
  void setSupported(const Array& dataclasses) {
    device.setResource("AccountTypesProperties",
                       Dictionary{{"T", Dictionary{{"Supported Dataclasses", dataclasses}}}});
  }
  static std::optional<StringList> supported() {
    return ASSBasicAccount::supportedDataclassesForAccountType("T");
  }
  std::size_t countOfLoads() const {
    return device.countOfFileCalls("readPropertyListFile(" +
                                   device.resourcePath("AccountTypesProperties"));
  }
  AccountsDevice device;
};

TEST_F(TypeCatalogue, ListsTheFourteenDataclassesInTheirOrderEverywhere) {
  const Lines expected = {
      "com.vantor.Dataclass.Mail",           "com.vantor.Dataclass.Contacts",
      "com.vantor.Dataclass.Calendars",      "com.vantor.Dataclass.Reminders",
      "com.vantor.Dataclass.Bookmarks",      "com.vantor.Dataclass.Notes",
      "com.vantor.Dataclass.MediaStream",    "com.vantor.Dataclass.DeviceLocator",
      "com.vantor.Dataclass.ContactsSearch", "com.vantor.Dataclass.Backup",
      "com.vantor.Dataclass.Ubiquity",       "com.vantor.Dataclass.KeyValue",
      "com.vantor.Dataclass.Shoebox",        "com.vantor.Dataclass.SharedStreams"};
  device.deviceInfo.properties["CPUArchitecture"] = "armv6";
  EXPECT_EQ(ASSBasicAccount::allSupportedDataclasses(), expected);
  EXPECT_EQ(&ASSBasicAccount::allSupportedDataclasses(),
            &ASSBasicAccount::allSupportedDataclasses());
}

TEST_F(TypeCatalogue, KeepsKnownDataclassesInTheOrderOfTheResourceRepeatsIncluded) {
  setSupported({kNotes, kUnknown, kContacts, 7, kMail, kContacts});
  EXPECT_EQ(supported(), (Lines{kNotes, kContacts, kMail, kContacts}));
}

TEST_F(TypeCatalogue, KeepsEachOfTheFourteenKnownDataclasses) {
  const StringList& all = ASSBasicAccount::allSupportedDataclasses();
  setSupported(arrayOfStrings(all));
  EXPECT_EQ(supported(), all);
}

TEST_F(TypeCatalogue, ComparesDataclassesExactly) {
  setSupported({kMail, "com.vantor.dataclass.Mail", "com.vantor.Dataclass.Mail "});
  EXPECT_EQ(supported(), (Lines{kMail}));
}

TEST_F(TypeCatalogue, LeavesAListWithoutAnyKnownDataclassAsItIs) {
  setSupported({kUnknown, "other", kUnknown});
  EXPECT_EQ(supported(), (Lines{kUnknown, "other", kUnknown}));
}

TEST_F(TypeCatalogue, DropsNotesOnADeviceWithOneApplicationAtATime) {
  device.deviceInfo.properties["CPUArchitecture"] = "armv6";
  setSupported({kNotes, kMail});
  EXPECT_EQ(supported(), (Lines{kMail}));
}

TEST_F(TypeCatalogue, LeavesNotesAloneOnSuchADeviceWhenNothingElseIsKept) {
  device.deviceInfo.properties["CPUArchitecture"] = "armv6";
  setSupported({kNotes, kUnknown});
  EXPECT_EQ(supported(), (Lines{kNotes, kUnknown}));
}

TEST_F(TypeCatalogue, OnlyTheExactArchitectureLacksMultitasking) {
  EXPECT_TRUE(ASSBasicAccount::isMultitaskingEnabled());
  for (const char* architecture : {"armv7", "ARMv6", "armv6 ", "", "armv6k"}) {
    device.deviceInfo.properties["CPUArchitecture"] = architecture;
    EXPECT_TRUE(ASSBasicAccount::isMultitaskingEnabled()) << architecture;
  }
  device.deviceInfo.properties["CPUArchitecture"] = "armv6";
  EXPECT_FALSE(ASSBasicAccount::isMultitaskingEnabled());
}

TEST_F(TypeCatalogue, TypeWithoutAListIsValidAndSupportsNothing) {
  EXPECT_TRUE(OpenAccount::_isValidAccountType("SMTP"));
  EXPECT_EQ(ASSBasicAccount::supportedDataclassesForAccountType("SMTP"), std::nullopt);
}

TEST_F(TypeCatalogue, LeavesTheOtherKeysOfATypeAsTheyAre) {
  device.setResource("AccountTypesProperties",
                     Dictionary{{"T", Dictionary{{"Supported Dataclasses", Array{kMail, kUnknown}},
                                                 {"Delete Account Actions", Array{"x", kUnknown}},
                                                 {"Show Reminders Separately", true}}}});
  EXPECT_EQ(supported(), (Lines{kMail}));
  EXPECT_EQ(ASSBasicAccount::deleteAccountActionsForAccountType("T"), (Lines{"x", kUnknown}));
  EXPECT_TRUE(ASSBasicAccount::showRemindersSeparatelyForAccountType("T"));
}

TEST_F(TypeCatalogue, RemindersAreShownSeparatelyOnlyWhereTheTypeSaysSo) {
  device.setResource("AccountTypesProperties",
                     Dictionary{{"yes", Dictionary{{"Show Reminders Separately", true}}},
                                {"no", Dictionary{{"Show Reminders Separately", false}}},
                                {"silent", Dictionary()}});
  EXPECT_TRUE(ASSBasicAccount::showRemindersSeparatelyForAccountType("yes"));
  EXPECT_FALSE(ASSBasicAccount::showRemindersSeparatelyForAccountType("no"));
  EXPECT_FALSE(ASSBasicAccount::showRemindersSeparatelyForAccountType("silent"));
}

TEST_F(TypeCatalogue, UnknownTypeAnswersNothingWithoutAWord) {
  for (const char* type : {"Fax", "mail", ""}) {
    SCOPED_TRACE(type);
    EXPECT_EQ(ASSBasicAccount::supportedDataclassesForAccountType(type), std::nullopt);
    EXPECT_EQ(ASSBasicAccount::userActionsToEnableDataclassForAccountType(kNotes, type),
              std::nullopt);
    EXPECT_EQ(ASSBasicAccount::userActionsToDisableDataclassForAccountType(kMail, type),
              std::nullopt);
    EXPECT_EQ(ASSBasicAccount::deleteAccountActionsForAccountType(type), std::nullopt);
    EXPECT_FALSE(ASSBasicAccount::showRemindersSeparatelyForAccountType(type));
  }
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(TypeCatalogue, SurvivesEntriesOfTheWrongKind) {
  device.setResource(
      "AccountTypesProperties",
      Dictionary{{"string", "x"},
                 {"list is a string", Dictionary{{"Supported Dataclasses", kMail}}}});
  EXPECT_EQ(ASSBasicAccount::supportedDataclassesForAccountType("string"), std::nullopt);
  EXPECT_EQ(ASSBasicAccount::supportedDataclassesForAccountType("list is a string"), std::nullopt);
}

TEST_F(TypeCatalogue, IsLoadedOncePerProcess) {
  setSupported({kMail});
  EXPECT_EQ(supported(), (Lines{kMail}));
  setSupported({kContacts});
  ASSBasicAccount::initialize();
  EXPECT_EQ(supported(), (Lines{kMail}));
  EXPECT_TRUE(OpenAccount::_isValidAccountType("T"));
  EXPECT_EQ(countOfLoads(), 1U);
}

TEST_F(TypeCatalogue, ThreadThatComesDuringTheFirstLoadWaitsForIt) {
  setSupported({kMail});
  SecondComer second(device, "AccountTypesProperties",
                     [] { EXPECT_EQ(supported(), (Lines{kMail})); });
  EXPECT_EQ(supported(), (Lines{kMail}));
  second.join();
  EXPECT_EQ(countOfLoads(), 1U);
}

TEST_F(TypeCatalogue, MissingResourceIsAnAssertionFailureAndTheNextUseTriesAgain) {
  device.removeResource("AccountTypesProperties");
  const std::string kText = "Could not find AccountTypesProperties.plist";
  expectAssertionFailure(kText, "ASSBasicAccount", [] { ASSBasicAccount::initialize(); });
  expectAssertionFailure(kText, "ASSBasicAccount", [] { supported(); });
  setSupported({kMail});
  EXPECT_EQ(supported(), (Lines{kMail}));
}

TEST_F(TypeCatalogue, UnreadableResourceIsAnAssertionFailure) {
  const std::string kText = "Could not load the dataclasses configuration file";
  device.setResourceBytes("AccountTypesProperties", "no property list");
  expectAssertionFailure(kText, "ASSBasicAccount", [] { ASSBasicAccount::initialize(); });
  device.setResource("AccountTypesProperties", Array{"no dictionary"});
  expectAssertionFailure(kText, "ASSBasicAccount", [] { ASSBasicAccount::initialize(); });
}

TEST_F(TypeCatalogue, EveryInitialiserAndClassOperationNoticesAMissingResource) {
  device.removeResource("AccountTypesProperties");
  const std::string kText = "Could not find AccountTypesProperties.plist";
  expectAssertionFailure(kText, "ASSBasicAccount", [] { ASSBasicAccount::initWithProperties({}); });
  expectAssertionFailure(kText, "ASSBasicAccount",
                         [] { ASSBasicAccount::accountWithTypeClass("T", ""); });
  expectAssertionFailure(kText, "ASSBasicAccount",
                         [] { OpenAccount::_isValidAccountType(std::nullopt); });
  expectAssertionFailure(kText, "ASSBasicAccount", [] { OpenAccount::_dataclassesProperties(); });
  expectAssertionFailure(kText, "ASSBasicAccount",
                         [] { ASSBasicAccount::displayToggleForDataclass(kMail); });
  expectAssertionFailure(kText, "ASSBasicAccount", [] {
    ASSBasicAccount::removeActionsIncompatibleWithSingleStoreDataclass({});
  });
  EXPECT_TRUE(ASSBasicAccount::createNewAccountUID().has_value());
  EXPECT_EQ(ASSBasicAccount::allSupportedDataclasses().size(), 14U);
  EXPECT_TRUE(ASSBasicAccount::isMultitaskingEnabled());
}

TEST_F(TypeCatalogue, AnswersCannotChangeIt) {
  setSupported({kMail, kContacts});
  std::optional<StringList> answer = supported();
  answer->clear();
  EXPECT_EQ(supported(), (Lines{kMail, kContacts}));
}

}  // namespace
}  // namespace accountsettings
