// The built bundle, loaded as a host loads it. This program has none of the plug-in's code itself.

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <memory>

#include "platform/DataClassMigrator.h"
#include "platform/InternalConsistencyFailure.h"
#include "platform/posix/DlAddrBundleResources.h"
#include "platform/posix/ProcessClassRegistry.h"
#include "platform/testing/InMemoryDevice.h"

namespace platform {
namespace {

using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

constexpr const char* kClassName = "MergeAndRemoveQuillnetAccounts";

class Bundle : public ::testing::Test {
 protected:
  using Lines = std::vector<std::string>;
  Bundle() {
    device.preferences.applications["com.vantor.OTASyncAgent"] = {{"AccountName", "ada"}};
    device.syncDataSource.stores[{"Quillnet:ada", "Contacts"}].records = {{"1", "one"}};
    const Array enabled{Value("com.vantor.Dataclass.Contacts"),
                        Value("com.vantor.Dataclass.Bookmarks")};
    device.writeSettings({{"Version", 12},
                          {"Accounts", Array{Dictionary{{"Type", "Quillnet"},
                                                        {"Class", "QuillnetAccount"},
                                                        {"Identifier", "q"},
                                                        {"QuillnetStatus", 1},
                                                        {"Enabled Dataclasses", enabled}},
                                             mail}}});
  }
  static void load() {
    ASSERT_NE(::dlopen(BUNDLE_DIR "/QuillnetAccountRemoval.so", RTLD_NOW | RTLD_LOCAL), nullptr)
        << ::dlerror();
  }
  // A migrator of the loaded bundle; empty, with a failure, when its class is missing.
  static std::unique_ptr<DataClassMigrator> makeMigrator() {
    auto* migratorClass = dynamic_cast<DataClassMigratorClass*>(registeredClass(kClassName));
    EXPECT_NE(migratorClass, nullptr);
    return migratorClass != nullptr ? migratorClass->create() : nullptr;
  }

  const Dictionary mail{{"Type", "Mail"}, {"Class", "IMAPAccount"}, {"Identifier", "m"}};
  DlAddrBundleResources resourcesBesideTheCode{{"en"}};
  InMemoryDevice device;
};

TEST_F(Bundle, RegistersItsPrincipalClassWhenItIsLoaded) {
  EXPECT_EQ(registeredClass(kClassName), nullptr);
  load();
  ASSERT_NE(registeredClass(kClassName), nullptr);
  EXPECT_EQ(registeredClass(kClassName)->className(), kClassName);
  EXPECT_EQ(device.journal, CallJournal{});
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(Bundle, IsLoadedByTheRegistryAsABundleThatNamesItsPrincipalClass) {
  ProcessClassRegistry registry;
  const CodeBundlePtr bundle = registry.loadCodeBundle(BUNDLE_DIR);
  ASSERT_NE(bundle, nullptr);
  EXPECT_EQ(bundle->principalClassName(), kClassName);
  EXPECT_NE(dynamic_cast<DataClassMigratorClass*>(registry.classNamed(kClassName)), nullptr);
}

TEST_F(Bundle, LoadedTwiceKeepsItsClass) {
  load();
  RuntimeClass* const first = registeredClass(kClassName);
  load();
  EXPECT_EQ(registeredClass(kClassName), first);
}

TEST_F(Bundle, RunsWithTheResourcesThatLieBesideIt) {
  load();
  device.use<BundleResources>(resourcesBesideTheCode);
  const std::unique_ptr<DataClassMigrator> migrator = makeMigrator();
  ASSERT_NE(migrator, nullptr);
  EXPECT_EQ(migrator->dataClassName(), "Quillnet Account Removal");
  EXPECT_TRUE(migrator->performMigration());
  EXPECT_EQ(device.logLines(), (Lines{"Checking account <ASSBasicAccount: q> of type Quillnet",
                                      "Merging com.vantor.Dataclass.Contacts to the localstore",
                                      "mergeSyncDataForDataclass", "removeDataStoreForDataclass",
                                      "DeviceLocalAccount missing. Creating...",
                                      "Merging com.vantor.Dataclass.Bookmarks to the localstore",
                                      "createLocalDataSourceForDataclass",
                                      "Checking account <ASSBasicAccount: m> of type Mail"}));
  EXPECT_EQ(device.readSettings(), (Dictionary{{"Version", 12}, {"Accounts", Array{Value(mail)}}}));
  EXPECT_EQ(device.syncDataSource.records(std::nullopt, "Contacts"),
            (std::vector<InMemorySyncDataSource::Record>{{"1", "one"}}));
  EXPECT_TRUE(device.syncDataSource.storeExists(std::nullopt, "Bookmarks"));
}

TEST_F(Bundle, RaisesFailuresThatTheHostCanCatchByTheirClass) {
  load();
  const std::unique_ptr<DataClassMigrator> migrator = makeMigrator();
  ASSERT_NE(migrator, nullptr);
  const std::optional<std::string> before = device.readSettingsBytes();
  try {
    migrator->performMigration();
    FAIL() << "nothing was raised";
  } catch (const InternalConsistencyFailure& failure) {
    EXPECT_STREQ(failure.what(), "Could not find AccountTypesProperties.plist");
    EXPECT_EQ(failure.sourceFile(), "ASSBasicAccount");
  }
  EXPECT_EQ(device.readSettingsBytes(), before);
}

}  // namespace
}  // namespace platform
