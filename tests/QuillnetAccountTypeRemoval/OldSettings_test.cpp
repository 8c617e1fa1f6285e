#include <gtest/gtest.h>

#include <fstream>
#include <iterator>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

// Settings files as older versions left them, kept under tests/data/settings/ and never made anew.
class OldSettings : public ::testing::Test {
 protected:
  std::shared_ptr<OpenStore> load(const std::string& name) {
    std::ifstream file(std::string(TEST_DATA_DIR) + "/settings/" + name, std::fstream::binary);
    EXPECT_TRUE(file.is_open()) << name;
    device.writeSettingsBytes(std::string(std::istreambuf_iterator<char>(file), {}));
    accountsBefore = device.savedAccounts();
    return OpenStore::ofFile();
  }
  AccountsDevice device;
  Array accountsBefore;
};

TEST_F(OldSettings, OfVersionFiveInXMLKeepEveryKeyAndGetTheMissingMailClass) {
  const auto store = load("version-5-xml.plist");
  EXPECT_EQ(store->dataVersion(), 5);
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()),
            (Lines{"5E1F0A52-0001-4A6B-9C3D-0D5A4C1E0001", "5E1F0A52-0002-4A6B-9C3D-0D5A4C1E0002",
                   "5E1F0A52-0003-4A6B-9C3D-0D5A4C1E0003"}));
  const AccountPtr exchange = (*store->allBasicAccounts())[2];
  EXPECT_EQ(*exchange->accountPropertyForKey("Timeout"), Value(29.5));
  EXPECT_EQ(*exchange->accountPropertyForKey("Policy Key"),
            Value(propertylist::Bytes{0x00, 0x01, 0xfe, 0xff}));
  EXPECT_EQ(*exchange->accountPropertyForKey("Created"), Value(propertylist::Date{266932800.0}));
  EXPECT_EQ((*store->allBasicAccounts())[0]->displayName(), "B\u00fcro");

  store->saveAllAccounts();
  const Dictionary fixed = with(*accountsBefore[1].asDictionary(), "Class", "POPAccount");
  EXPECT_EQ(device.readSettings(),
            (Dictionary{{"Version", 12},
                        {"Accounts", Array{accountsBefore[0], fixed, accountsBefore[2]}}}));
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(OldSettings, OfVersionNineInBinaryKeepAccountsAndChildren) {
  const auto store = load("version-9-binary.plist");
  EXPECT_EQ(store->dataVersion(), 9);
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()), (Lines{"QN-1", "SUB-1", "LDAP-1"}));
  EXPECT_EQ(store->children(), (Lines{"QN-1-CAL of QN-1", "QN-1-CARD of QN-1"}));
  const AccountPtr service = store->accountWithIdentifier("QN-1");
  EXPECT_EQ(*service->accountPropertyForKey("QuillnetStatus"), Value(1));
  EXPECT_EQ(service->enabledDataclasses(),
            (Lines{"com.vantor.Dataclass.Contacts", "com.vantor.Dataclass.Calendars",
                   "com.vantor.Dataclass.Bookmarks"}));
  EXPECT_EQ(store->childAccountsByID().at("QN-1-CAL")->syncStoreIdentifier(), "QN-1-SYNC");
  EXPECT_EQ(store->childAccountsByID().at("QN-1-CARD")->syncStoreIdentifier(), "QN-1-CARD-SYNC");

  store->deleteAccountWithIdentifier("QN-1");
  store->saveAllAccounts();
  EXPECT_EQ(
      device.readSettings(),
      (Dictionary{{"Version", 12}, {"Accounts", Array{accountsBefore[1], accountsBefore[2]}}}));
  EXPECT_EQ(device.logLines(), Lines());
}

TEST_F(OldSettings, OfVersionTwelveStayAsTheyAre) {
  const auto store = load("version-12-binary.plist");
  EXPECT_EQ(store->dataVersion(), 12);
  EXPECT_EQ(identifiersOf(*store->allBasicAccounts()),
            (Lines{"DeviceLocalAccount", "VA-1", "GM-1"}));
  EXPECT_EQ((*store->allBasicAccounts())[0]->className(), "ASSDeviceLocalAccount");
  EXPECT_EQ(*store->accountWithIdentifier("VA-1")->accountPropertyForKey("QuillnetStatus"),
            Value("1"));
  EXPECT_EQ(store->accountWithIdentifier("VA-1")->displayName(), "\u4f4f\u6240\u9332");
  store->saveAllAccounts();
  EXPECT_EQ(device.readSettings(), (Dictionary{{"Version", 12}, {"Accounts", accountsBefore}}));
  EXPECT_EQ(device.logLines(), Lines());
}

}  // namespace
}  // namespace accountsettings
