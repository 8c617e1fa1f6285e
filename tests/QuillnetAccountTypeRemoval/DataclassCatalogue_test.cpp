#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr const char* kMail = "com.vantor.Dataclass.Mail";
constexpr const char* kContacts = "com.vantor.Dataclass.Contacts";
constexpr const char* kKeep = "Keep Local Data";
constexpr const char* kMerge = "Merge Local Data";

class DataclassCatalogue : public ::testing::Test {
 protected:
  std::size_t countOfLoads() const {
    return device.countOfFileCalls("readPropertyListFile(" +
                                   device.resourcePath("DataclassesProperties"));
  }
  AccountsDevice device;
};

TEST_F(DataclassCatalogue, AnswersEachFlagFromItsOwnKey) {
  device.setResource("DataclassesProperties",
                     Dictionary{{"stores", Dictionary{{"Supports Multiple Stores", true}}},
                                {"switch", Dictionary{{"Display Dataclass Switch", true}}},
                                {"confirm", Dictionary{{"Requires User Confirmation", true}}},
                                {"off", Dictionary{{"Supports Multiple Stores", false},
                                                   {"Display Dataclass Switch", false},
                                                   {"Requires User Confirmation", false}}},
                                {"wrong kind", "x"}});
  const struct {
    const char* dataclass;
    bool stores, displayed, confirmed;
  } kCases[] = {
      {"stores", true, false, false},      {"switch", false, true, false},
      {"confirm", false, false, true},     {"off", false, false, false},
      {"wrong kind", false, false, false}, {"unknown", false, false, false},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.dataclass);
    EXPECT_EQ(ASSBasicAccount::multipleStoresSupportedByDataclass(c.dataclass), c.stores);
    EXPECT_EQ(ASSBasicAccount::displayToggleForDataclass(c.dataclass), c.displayed);
    EXPECT_EQ(ASSBasicAccount::userConfirmationIsRequiredByDataclass(c.dataclass), c.confirmed);
  }
  EXPECT_EQ(device.logLines(), Lines());
  EXPECT_EQ(countOfLoads(), 1U);
}

TEST_F(DataclassCatalogue, IsLoadedAtTheFirstFlagAndNeverAgain) {
  ASSBasicAccount::supportedDataclassesForAccountType("Mail");
  EXPECT_EQ(countOfLoads(), 0U);
  EXPECT_TRUE(ASSBasicAccount::multipleStoresSupportedByDataclass(kContacts));
  device.setResource("DataclassesProperties",
                     Dictionary{{kContacts, Dictionary{{"Display Dataclass Switch", true}}}});
  EXPECT_TRUE(ASSBasicAccount::multipleStoresSupportedByDataclass(kContacts));
  EXPECT_FALSE(ASSBasicAccount::displayToggleForDataclass(kContacts));
  EXPECT_EQ(countOfLoads(), 1U);
}

TEST_F(DataclassCatalogue, ThreadThatComesDuringTheFirstLoadWaitsForIt) {
  SecondComer second(device, "DataclassesProperties", [] {
    EXPECT_TRUE(ASSBasicAccount::multipleStoresSupportedByDataclass(kContacts));
  });
  EXPECT_TRUE(ASSBasicAccount::multipleStoresSupportedByDataclass(kContacts));
  second.join();
  EXPECT_EQ(countOfLoads(), 1U);
}

TEST_F(DataclassCatalogue, MissingResourceMakesEveryFlagFalseForGoodWithoutAWord) {
  device.removeResource("DataclassesProperties");
  EXPECT_FALSE(ASSBasicAccount::multipleStoresSupportedByDataclass(kContacts));
  device.setResource("DataclassesProperties",
                     Dictionary{{kContacts, Dictionary{{"Supports Multiple Stores", true}}}});
  EXPECT_FALSE(ASSBasicAccount::multipleStoresSupportedByDataclass(kContacts));
  EXPECT_FALSE(ASSBasicAccount::displayToggleForDataclass(kContacts));
  EXPECT_FALSE(ASSBasicAccount::userConfirmationIsRequiredByDataclass(kContacts));
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(DataclassCatalogue, UnreadableResourceMakesEveryFlagFalseWithoutAWord) {
  device.setResourceBytes("DataclassesProperties", "no property list");
  EXPECT_FALSE(ASSBasicAccount::multipleStoresSupportedByDataclass(kContacts));
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(DataclassCatalogue, ReadingTheResourceItselfIsAlwaysFresh) {
  device.setResource("DataclassesProperties", Dictionary{{"a", 1}});
  EXPECT_EQ(OpenAccount::_dataclassesProperties(), (Dictionary{{"a", 1}}));
  device.setResource("DataclassesProperties", Dictionary{{"a", 2}});
  EXPECT_EQ(OpenAccount::_dataclassesProperties(), (Dictionary{{"a", 2}}));
  device.setResource("DataclassesProperties", Array{"no dictionary"});
  EXPECT_EQ(OpenAccount::_dataclassesProperties(), std::nullopt);
  device.removeResource("DataclassesProperties");
  EXPECT_EQ(OpenAccount::_dataclassesProperties(), std::nullopt);
}

TEST_F(DataclassCatalogue, RemovesTheLastKeepLocalDataAlone) {
  const struct {
    const char* name;
    Lines actions, kept;
  } kCases[] = {
      {"two of them", {kKeep, kMerge, kKeep}, {kKeep, kMerge}},
      {"one in front", {kKeep, kMerge}, {kMerge}},
      {"none", {kMerge, "None"}, {kMerge, "None"}},
      {"nothing", {}, {}},
      {"alone", {kKeep}, {}},
      {"other case", {"keep local data"}, {"keep local data"}},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    EXPECT_EQ(ASSBasicAccount::removeActionsIncompatibleWithSingleStoreDataclass(c.actions),
              c.kept);
  }
}

TEST_F(DataclassCatalogue, SwitchActionsBelongToTheTypeAndLackTheLastKeepWhereThereIsOneStore) {
  device.setResource(
      "AccountTypesProperties",
      Dictionary{{"T", Dictionary{{"Enable Actions", Array{kKeep, kMerge, kKeep}},
                                  {"Disable Actions", Array{kKeep, "Delete Sync Data"}},
                                  {"Delete Account Actions", Array{kKeep, "Delete Data"}}}},
                 {"silent", Dictionary()}});
  // Several stores; the type need not even support the dataclass.
  EXPECT_EQ(ASSBasicAccount::userActionsToEnableDataclassForAccountType(kContacts, "T"),
            (Lines{kKeep, kMerge, kKeep}));
  EXPECT_EQ(ASSBasicAccount::userActionsToDisableDataclassForAccountType(kContacts, "T"),
            (Lines{kKeep, "Delete Sync Data"}));
  // One store: Mail is not in the catalogue of dataclasses, nor is the unknown one.
  for (const char* dataclass : {kMail, "unknown"}) {
    SCOPED_TRACE(dataclass);
    EXPECT_EQ(ASSBasicAccount::userActionsToEnableDataclassForAccountType(dataclass, "T"),
              (Lines{kKeep, kMerge}));
    EXPECT_EQ(ASSBasicAccount::userActionsToDisableDataclassForAccountType(dataclass, "T"),
              (Lines{"Delete Sync Data"}));
  }
  EXPECT_EQ(ASSBasicAccount::deleteAccountActionsForAccountType("T"),
            (Lines{kKeep, "Delete Data"}));
  EXPECT_EQ(ASSBasicAccount::userActionsToEnableDataclassForAccountType(kMail, "silent"),
            std::nullopt);
  EXPECT_EQ(ASSBasicAccount::deleteAccountActionsForAccountType("silent"), std::nullopt);
}

}  // namespace
}  // namespace accountsettings
