#include <gtest/gtest.h>

#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {
namespace {

class DeviceLocalAccount : public ::testing::Test {
 protected:
  DeviceLocalAccount() {
    device.bundleResources.texts["DeviceLocalAccount"] = {
        {"ON_MY_DEVICE_TYPE_KALLO", "On My Kallo"},
        {"ON_MY_DEVICE_TYPE_KALLO_SLATE", "On My Slate"}};
  }
  AccountsDevice device;
};

TEST_F(DeviceLocalAccount, NewOneHasFivePropertiesAndNoSyncIdentifier) {
  const Dictionary expected{{"Type", "OnMyDevice"},
                            {"Class", "ASSDeviceLocalAccount"},
                            {"Type String", "On My Kallo"},
                            {"Short Type String", "On My Kallo"},
                            {"Identifier", "DeviceLocalAccount"}};
  EXPECT_EQ(ASSDeviceLocalAccount::basicAccountProperties(), expected);
  const auto account = ASSDeviceLocalAccount::initWithProperties(expected);
  EXPECT_EQ(account->properties(), expected);
  EXPECT_EQ(account->syncStoreIdentifier(), "DeviceLocalAccount");
}

TEST_F(DeviceLocalAccount, PropertiesNameTheReceivingClass) {
  EXPECT_EQ(*ASSDeviceLocalAccount::basicAccountProperties("Narrower").find("Class"),
            Value("Narrower"));
}

TEST_F(DeviceLocalAccount, AnswersItsFixedIdentityWhateverIsStored) {
  const Dictionary stored = accountInfo("X", "OnMyDevice",
                                        {{"Sync Identifier", "Y"},
                                         {"DisplayName", "Z"},
                                         {"Type String", "T"},
                                         {"Short Type String", "S"}});
  const auto account = ASSDeviceLocalAccount::initWithProperties(stored);
  EXPECT_EQ(account->identifier(), "DeviceLocalAccount");
  EXPECT_EQ(account->syncStoreIdentifier(), "DeviceLocalAccount");
  EXPECT_EQ(account->displayName(), "On My Kallo");
  EXPECT_EQ(account->typeString(), "T");
  EXPECT_EQ(account->shortTypeString(), "S");
  EXPECT_EQ(account->properties(), stored);
  EXPECT_EQ(account->description(), "<ASSDeviceLocalAccount: DeviceLocalAccount>");
}

TEST_F(DeviceLocalAccount, AnswersTheSameThroughTheBaseClass) {
  const AccountPtr account = ASSDeviceLocalAccount::initWithProperties(
      accountInfo("X", "OnMyDevice", {{"DisplayName", "Z"}}));
  EXPECT_EQ(account->identifier(), "DeviceLocalAccount");
  EXPECT_EQ(account->displayName(), "On My Kallo");
}

TEST_F(DeviceLocalAccount, NameFollowsTheDeviceClass) {
  const struct {
    const char* deviceClass;
    const char* key;
  } kCases[] = {
      {"Kallo Slate", "ON_MY_DEVICE_TYPE_KALLO_SLATE"},
      {"Kallo", "ON_MY_DEVICE_TYPE_KALLO"},
      {"kallo", "ON_MY_DEVICE_TYPE_KALLO"},
      {"Kallo  Mini", "ON_MY_DEVICE_TYPE_KALLO__MINI"},
      {" x ", "ON_MY_DEVICE_TYPE__X_"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.deviceClass);
    device.deviceInfo.properties["DeviceClass"] = c.deviceClass;
    ASSDeviceLocalAccount::classTypeString();
    EXPECT_EQ(device.bundleResources.calls().back(),
              "localizedString(" + std::string(c.key) + ", DeviceLocalAccount)");
  }
  device.deviceInfo.properties["DeviceClass"] = "Kallo Slate";
  EXPECT_EQ(ASSDeviceLocalAccount::classTypeString(), "On My Slate");
}

TEST_F(DeviceLocalAccount, DeviceWithoutAClassCountsAsKallo) {
  device.deviceInfo.properties.erase("DeviceClass");
  EXPECT_EQ(ASSDeviceLocalAccount::classTypeString(), "On My Kallo");
}

TEST_F(DeviceLocalAccount, NameWithoutATextIsTheKey) {
  device.deviceInfo.properties["DeviceClass"] = "Kallo Grand";
  const auto account = ASSDeviceLocalAccount::initWithProperties(accountInfo("X", "OnMyDevice"));
  EXPECT_EQ(account->displayName(), "ON_MY_DEVICE_TYPE_KALLO_GRAND");
}

TEST_F(DeviceLocalAccount, IsMadeFromARecordThatStaysAsItIs) {
  const AccountPtr basic =
      ASSBasicAccount::initWithProperties(accountInfo("X", "OnMyDevice", {{"k", 1}}));
  const auto account = ASSDeviceLocalAccount::accountWithBasicAccount(*basic);
  EXPECT_EQ(account->properties(), basic->properties());
  account->setAccountPropertyForKey(2, "k");
  EXPECT_EQ(basic->properties(), accountInfo("X", "OnMyDevice", {{"k", 1}}));
  EXPECT_EQ(basic.use_count(), 1);
}

TEST_F(DeviceLocalAccount, IsCheckedLikeEveryRecord) {
  const AccountPtr basic = ASSBasicAccount::initWithProperties(accountInfo("X", "OnMyDevice"));
  basic->removeAccountPropertyForKey("Class");
  EXPECT_EQ(ASSDeviceLocalAccount::accountWithBasicAccount(*basic), nullptr);
  EXPECT_EQ(ASSDeviceLocalAccount::initWithProperties({{"Type", "Fax"}, {"Class", "C"}}), nullptr);
  EXPECT_EQ(device.logLines(),
            (Lines{"[-[ASSBasicAccount initWithProperties:]] Missing account class.",
                   "[-[ASSBasicAccount initWithProperties:]] Invalid account type: Fax"}));
}

TEST_F(DeviceLocalAccount, CannotBeMadeWhereTheCatalogueLacksItsType) {
  device.setResource("AccountTypesProperties", Dictionary{{"Mail", Dictionary()}});
  EXPECT_EQ(
      ASSDeviceLocalAccount::initWithProperties(ASSDeviceLocalAccount::basicAccountProperties()),
      nullptr);
}

}  // namespace
}  // namespace accountsettings
