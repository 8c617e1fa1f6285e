#include <gtest/gtest.h>

#include <regex>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

constexpr const char* kInvalidType =
    "[-[ASSBasicAccount initWithProperties:]] Invalid account type: ";
constexpr const char* kMissingClass =
    "[-[ASSBasicAccount initWithProperties:]] Missing account class.";
constexpr const char* kFirstUID = "00000000-0000-4000-8000-000000000001";

class RecordMaking : public ::testing::Test {
 protected:
  AccountsDevice device;
};

TEST_F(RecordMaking, RefusesAnUnknownTypeOrAMissingClassAndSaysWhy) {
  const struct {
    const char* name;
    Dictionary properties;
    Lines lines;
  } kCases[] = {
      {"unknown type with a class",
       {{"Type", "Fax"}, {"Class", "C"}},
       {std::string(kInvalidType) + "Fax"}},
      {"unknown type without a class",
       {{"Type", "Fax"}},
       {std::string(kInvalidType) + "Fax", kMissingClass}},
      {"unknown type with an empty class",
       {{"Type", "Fax"}, {"Class", ""}},
       {std::string(kInvalidType) + "Fax", kMissingClass}},
      {"known type without a class", {{"Type", "CalDAV"}}, {kMissingClass}},
      {"known type with an empty class", {{"Type", "CalDAV"}, {"Class", ""}}, {kMissingClass}},
      {"class that is no string", {{"Type", "CalDAV"}, {"Class", true}}, {kMissingClass}},
      {"no type", {{"Class", "C"}}, {std::string(kInvalidType) + "(null)"}},
      {"empty type", {{"Type", ""}, {"Class", "C"}}, {kInvalidType}},
      {"type that is no string", {{"Type", 7}, {"Class", "C"}}, {std::string(kInvalidType) + "7"}},
      {"type in other case",
       {{"Type", "caldav"}, {"Class", "C"}},
       {std::string(kInvalidType) + "caldav"}},
      {"type with a blank",
       {{"Type", "CalDAV "}, {"Class", "C"}},
       {std::string(kInvalidType) + "CalDAV "}},
      {"type full of conversions",
       {{"Type", "%s%n%@"}, {"Class", "C"}},
       {std::string(kInvalidType) + "%s%n%@"}},
      {"nothing", {}, {std::string(kInvalidType) + "(null)", kMissingClass}},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    device.systemLog.clear();
    EXPECT_EQ(ASSBasicAccount::initWithProperties(c.properties), nullptr);
    EXPECT_EQ(device.logLines(), c.lines);
  }
}

TEST_F(RecordMaking, TypeIsValidWhenTheCatalogueHasAnEntryUnderExactlyThatText) {
  EXPECT_TRUE(OpenAccount::_isValidAccountType("CalDAV"));
  EXPECT_TRUE(OpenAccount::_isValidAccountType("SMTP"));  // an empty entry
  EXPECT_FALSE(OpenAccount::_isValidAccountType("caldav"));
  EXPECT_FALSE(OpenAccount::_isValidAccountType("CalDAV "));
  EXPECT_FALSE(OpenAccount::_isValidAccountType(""));
  EXPECT_FALSE(OpenAccount::_isValidAccountType(std::nullopt));
}

TEST_F(RecordMaking, FirstCallOfAProcessFindsTheCatalogue) {
  EXPECT_NE(ASSBasicAccount::initWithProperties(accountInfo("1")), nullptr);
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(RecordMaking, KeepsTheGivenPropertiesAsOriginalAndACopyToChange) {
  Dictionary given = accountInfo("1", "CalDAV", {{"Username", "ada"}});
  const AccountPtr account = ASSBasicAccount::initWithProperties(given);
  given.set("later", 1);
  account->setAccountPropertyForKey(2, "own");
  EXPECT_EQ(account->originalProperties(), accountInfo("1", "CalDAV", {{"Username", "ada"}}));
  EXPECT_EQ(account->properties(), accountInfo("1", "CalDAV", {{"Username", "ada"}, {"own", 2}}));
  EXPECT_FALSE(given.contains("own"));
  EXPECT_EQ(account->parentAccount(), nullptr);
}

TEST_F(RecordMaking, WithoutIdentifiersStoresOneNewUIDUnderBothInThePropertiesOnly) {
  const Dictionary given{{"Type", "CalDAV"}, {"Class", "C"}};
  const AccountPtr account = ASSBasicAccount::initWithProperties(given);
  EXPECT_EQ(account->properties(), (Dictionary{{"Type", "CalDAV"},
                                               {"Class", "C"},
                                               {"Identifier", kFirstUID},
                                               {"Sync Identifier", kFirstUID}}));
  EXPECT_EQ(account->originalProperties(), given);
}

TEST_F(RecordMaking, KeepsAGivenSyncIdentifier) {
  const AccountPtr account = ASSBasicAccount::initWithProperties(
      {{"Type", "CalDAV"}, {"Class", "C"}, {"Sync Identifier", "given"}});
  EXPECT_EQ(account->identifier(), kFirstUID);
  EXPECT_EQ(account->syncStoreIdentifier(), "given");
}

TEST_F(RecordMaking, AddsNoSyncIdentifierToAnIdentifier) {
  const AccountPtr account = ASSBasicAccount::initWithProperties(accountInfo("1"));
  EXPECT_EQ(account->properties(), accountInfo("1"));
  EXPECT_TRUE(device.uuidGenerator.calls().empty());
}

TEST_F(RecordMaking, GivesEachRecordAnIdentifierOfItsOwn) {
  const Dictionary given{{"Type", "CalDAV"}, {"Class", "C"}};
  EXPECT_NE(ASSBasicAccount::initWithProperties(given)->identifier(),
            ASSBasicAccount::initWithProperties(given)->identifier());
}

TEST_F(RecordMaking, MakesARecordWithoutIdentifierWhereThePlatformMakesNoUUID) {
  device.uuidGenerator.failEvery("generateUUID");
  EXPECT_EQ(ASSBasicAccount::createNewAccountUID(), std::nullopt);
  const Dictionary given{{"Type", "CalDAV"}, {"Class", "C"}};
  const AccountPtr loaded = ASSBasicAccount::initWithProperties(given);
  const AccountPtr created = ASSBasicAccount::accountWithTypeClass("CalDAV", "C");
  EXPECT_EQ(loaded->properties(), given);
  EXPECT_EQ(created->properties(), given);
  EXPECT_EQ(loaded->identifier(), std::nullopt);
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(RecordMaking, NewAccountHasTypeClassAndOneUIDTwice) {
  const AccountPtr account = ASSBasicAccount::accountWithTypeClass("CalDAV", "CalDAVAccount");
  const Dictionary expected{{"Type", "CalDAV"},
                            {"Class", "CalDAVAccount"},
                            {"Identifier", kFirstUID},
                            {"Sync Identifier", kFirstUID}};
  EXPECT_EQ(account->properties(), expected);
  EXPECT_EQ(account->originalProperties(), expected);
  EXPECT_EQ(account->parentAccount(), nullptr);
}

TEST_F(RecordMaking, NewAccountNeedsAClassFirstAndThenAKnownType) {
  const std::string kClassText = "The account class is required.";
  expectAssertionFailure(kClassText, "ASSBasicAccount",
                         [] { ASSBasicAccount::accountWithTypeClass("CalDAV", ""); });
  expectAssertionFailure(kClassText, "ASSBasicAccount",
                         [] { ASSBasicAccount::accountWithTypeClass("CalDAV", std::nullopt); });
  expectAssertionFailure(kClassText, "ASSBasicAccount",
                         [] { ASSBasicAccount::accountWithTypeClass("Fax", ""); });
  expectAssertionFailure("The account type (Fax) is not supported", "ASSBasicAccount",
                         [] { ASSBasicAccount::accountWithTypeClass("Fax", "C"); });
  expectAssertionFailure("The account type (100%@) is not supported", "ASSBasicAccount",
                         [] { ASSBasicAccount::accountWithTypeClass("100%@", "C"); });
  expectAssertionFailure("The account type ((null)) is not supported", "ASSBasicAccount",
                         [] { ASSBasicAccount::accountWithTypeClass(std::nullopt, "C"); });
}

TEST_F(RecordMaking, PlainInitIsForbidden) {
  expectAssertionFailure("Don't use this method", "ASSBasicAccount",
                         [] { ASSBasicAccount::init(); });
}

TEST_F(RecordMaking, GivesARecordOfTheReceivingClass) {
  const Dictionary local = accountInfo("1", "OnMyDevice");
  EXPECT_EQ(ASSBasicAccount::accountWithProperties(local)->className(), "ASSBasicAccount");
  const AccountPtr account = ASSDeviceLocalAccount::accountWithProperties(local);
  EXPECT_EQ(account->className(), "ASSDeviceLocalAccount");
}

TEST_F(RecordMaking, NeverLogsPropertiesOfAGoodAccount) {
  ASSBasicAccount::initWithProperties(accountInfo("1", "CalDAV", {{"Username", "ada"}}));
  EXPECT_EQ(device.logLines(), Lines());
}

}  // namespace
}  // namespace accountsettings
