// A plug-in whose own resources are missing or damaged raises through to the host.

#include "platform/InternalConsistencyFailure.h"
#include "tests/migrator/MigratorTest.h"

namespace migrator {
namespace {

class BrokenInstallation : public MigratorTest {
 protected:
  // Expects a run over a selected account to end in this failure and to change nothing.
  void expectFailure(const std::string& text) {
    writeAccounts({selectedInfo("q", {"Contacts"})});
    const std::optional<std::string> before = device.readSettingsBytes();
    try {
      migrator.performMigration();
      ADD_FAILURE() << "nothing was raised";
    } catch (const platform::InternalConsistencyFailure& failure) {
      EXPECT_EQ(failure.what(), text);
      EXPECT_EQ(failure.sourceFile(), "ASSBasicAccount");
      EXPECT_GT(failure.line(), 0);
    }
    EXPECT_EQ(device.readSettingsBytes(), before);
    EXPECT_EQ(device.journal, Journal{});
  }
};

TEST_F(BrokenInstallation, WithoutTheCatalogueOfTypesRaisesAndChangesNothing) {
  writeResource("DataclassesProperties", {});
  expectFailure("Could not find AccountTypesProperties.plist");
}

TEST_F(BrokenInstallation, WithADamagedCatalogueOfTypesRaisesAndChangesNothing) {
  writeResource("AccountTypesProperties", {});
  std::ofstream(device.root() + "/resources/AccountTypesProperties.plist") << "damaged";
  expectFailure("Could not load the dataclasses configuration file");
}

TEST_F(BrokenInstallation, IsTriedAgainOnceItIsRepaired) {
  writeResource("DataclassesProperties", {});
  expectFailure("Could not find AccountTypesProperties.plist");
  device.setResourcesDirectory(RESOURCES_DIR);
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(savedIdentifiers(), Lines{});
}

// Whether a dataclass has several stores is then answered with no, and nothing is merged.
TEST_F(BrokenInstallation, WithoutTheCatalogueOfDataclassesRunsAsIfEachHadOneStore) {
  useAccountTypes({{"Quillnet", Dictionary{{"Supported Dataclasses", dataclasses({"Contacts"})}}},
                   {"OnMyDevice", Dictionary()}});
  writeAccounts({selectedInfo("q", {"Contacts"}), deviceLocalInfo({})});
  EXPECT_TRUE(migrator.performMigration());
  EXPECT_EQ(device.logLines(),
            (Lines{"Checking account <ASSBasicAccount: q> of type Quillnet",
                   "Merging com.vantor.Dataclass.Contacts to the localstore",
                   "createLocalDataSourceForDataclass",
                   "Checking account <ASSDeviceLocalAccount: DeviceLocalAccount> of type "
                   "OnMyDevice"}));
}

}  // namespace
}  // namespace migrator
