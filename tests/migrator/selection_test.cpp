// Which accounts are retired, and what is said about the others.

#include "tests/migrator/MigratorTest.h"

namespace migrator {
namespace {

using Selection = MigratorTest;

struct StatusRow {
  const char* name;
  std::optional<Value> status;
  bool isSelected;
};

std::vector<StatusRow> statusRows() {
  return {
      {"1", Value(1), true},
      {"0", Value(0), false},
      {"2", Value(2), false},
      {"-1", Value(-1), false},
      {"beyond 32 bits", Value(4294967297), false},
      {"beyond 63 bits", Value(18446744073709551615U), false},
      {"absent", std::nullopt, false},
      {"true", Value(true), true},
      {"false", Value(false), false},
      {"1.9", Value(1.9), true},
      {"0.9", Value(0.9), false},
      {"text 1", Value("1"), true},
      {"text 1 with blanks and more", Value("  1 and so on"), true},
      {"text 10", Value("10"), false},
      {"text abc", Value("abc"), false},
      {"empty text", Value(""), false},
      {"array", Value(Array{Value(1)}), false},
      {"dictionary", Value(Dictionary{{"1", 1}}), false},
      {"data", Value(propertylist::Bytes{1}), false},
      {"date", Value(propertylist::Date{1}), false},
  };
}

TEST_F(Selection, NeedsTheServiceStatusOne) {
  for (const char* type : {"Quillnet", "VantorAccount"}) {
    for (const StatusRow& row : statusRows()) {
      SCOPED_TRACE(std::string(type) + ", status " + row.name);
      device.systemLog.clear();
      Dictionary account = accountInfo(type, "q", {});
      if (row.status) account.set("QuillnetStatus", *row.status);
      writeAccounts({account});
      EXPECT_TRUE(migrator.performMigration());
      EXPECT_EQ(savedIdentifiers(), row.isSelected ? Lines{} : Lines{"q"});
      EXPECT_EQ(device.logLines(),
                (Lines{"Checking account <ASSBasicAccount: q> of type " + std::string(type)}));
    }
  }
}

TEST_F(Selection, NeedsExactlyOneOfTheTwoTypes) {
  const Dictionary type{{"Supported Dataclasses", Array()}};
  useAccountTypes({{"Quillnet", type},
                   {"quillnet", type},
                   {"QUILLNET", type},
                   {"Quillnet ", type},
                   {"VantorAccount", type},
                   {"Vantor", type},
                   {"Mail", type}});
  std::vector<Value> accounts;
  for (const char* name :
       {"quillnet", "Quillnet", "QUILLNET", "Quillnet ", "VantorAccount", "Vantor", "Mail"})
    accounts.push_back(
        with(accountInfo(name, std::string("id of ") + name, {}), {{"QuillnetStatus", 1}}));
  writeAccounts(std::move(accounts));
  migrator.performMigration();
  EXPECT_EQ(savedIdentifiers(), (Lines{"id of quillnet", "id of QUILLNET", "id of Quillnet ",
                                       "id of Vantor", "id of Mail"}));
  EXPECT_EQ(device.logLines(),
            (Lines{"Checking account <ASSBasicAccount: id of quillnet> of type quillnet",
                   "Checking account <ASSBasicAccount: id of Quillnet> of type Quillnet",
                   "Checking account <ASSBasicAccount: id of QUILLNET> of type QUILLNET",
                   "Checking account <ASSBasicAccount: id of Quillnet > of type Quillnet ",
                   "Checking account <ASSBasicAccount: id of VantorAccount> of type VantorAccount",
                   "Checking account <ASSBasicAccount: id of Vantor> of type Vantor",
                   "Checking account <ASSBasicAccount: id of Mail> of type Mail"}));
}

TEST_F(Selection, ReadsTheStatusUnderThePlatformsKey) {
  device.accountFramework.statusKey = "Another Key";
  writeAccounts({with(accountInfo("Quillnet", "by another key", {}), {{"Another Key", 1}}),
                 selectedInfo("by the usual key", {})});
  migrator.performMigration();
  EXPECT_EQ(savedIdentifiers(), Lines{"by the usual key"});
}

TEST_F(Selection, AsksNothingAboutAccountsOfOtherTypes) {
  writeAccounts({with(accountInfo("CalDAV", "c", {"Calendars"}), {{"QuillnetStatus", 1}}),
                 with(deviceLocalInfo({"Contacts"}), {{"QuillnetStatus", 1}})});
  migrator.performMigration();
  EXPECT_EQ(device.accountFramework.calls(), Journal{});
  EXPECT_EQ(device.journal,
            (Journal{"log: Checking account <ASSBasicAccount: c> of type CalDAV",
                     "log: Checking account <ASSDeviceLocalAccount: DeviceLocalAccount> of type "
                     "OnMyDevice"}));
  EXPECT_EQ(savedIdentifiers(), (Lines{"c", "DeviceLocalAccount"}));
}

TEST_F(Selection, WritesNothingWhenNoAccountIsSelected) {
  writeAccounts({accountInfo("Quillnet", "q", {"Contacts"}), accountInfo("Mail", "m", {"Mail"})});
  const std::optional<std::string> before = device.readSettingsBytes();
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.readSettingsBytes(), before);
  EXPECT_EQ(settingsReads(), 1U);
  EXPECT_EQ(device.fileServices.calls().back(),
            "readPropertyListFile(" RESOURCES_DIR "/AccountTypesProperties.plist)");
}

TEST_F(Selection, NeverLooksAtChildAccounts) {
  const Dictionary kept = selectedInfo("child of a kept account", {});
  const Dictionary gone = selectedInfo("child of a selected account", {});
  writeAccounts({with(accountInfo("Mail", "m", {}), {{"ChildAccounts", Array{Value(kept)}}}),
                 with(selectedInfo("q", {}), {{"ChildAccounts", Array{Value(gone)}}})});
  migrator.performMigration();
  EXPECT_EQ(device.logLines(), (Lines{"Checking account <ASSBasicAccount: m> of type Mail",
                                      "Checking account <ASSBasicAccount: q> of type Quillnet"}));
  EXPECT_EQ(savedIdentifiers(), Lines{"m"});
  EXPECT_EQ(savedProperty("Mail", "ChildAccounts"), Value(Array{Value(kept)}));
}

TEST_F(Selection, SaysNothingWithoutAccounts) {
  EXPECT_TRUE(migrator.performMigration());
  writeAccounts({});
  EXPECT_TRUE(migrator.performMigration());
  device.writeSettings({});
  EXPECT_TRUE(migrator.performMigration());
  device.writeSettingsBytes("no property list");
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.journal, Journal{});
  EXPECT_EQ(device.readSettingsBytes(), "no property list");
}

TEST_F(Selection, IsToldAlsoWithVerboseTracingOff) {
  device.preferences.defaults = {{"ASLoggingEnabled", false}};
  writeAccounts({accountInfo("Mail", "m", {})});
  migrator.performMigration();
  EXPECT_EQ(device.logLines(), Lines{"Checking account <ASSBasicAccount: m> of type Mail"});
}

TEST_F(Selection, LineTakesTextsWithPercentSignsAsTheyAre) {
  writeAccounts({accountInfo("Mail", "50%@ %d %%", {})});
  migrator.performMigration();
  EXPECT_EQ(device.logLines(),
            Lines{"Checking account <ASSBasicAccount: 50%@ %d %%> of type Mail"});
}

}  // namespace
}  // namespace migrator
