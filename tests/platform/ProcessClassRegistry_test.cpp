#include "platform/posix/ProcessClassRegistry.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <optional>

#include "platform/DataClassMigrator.h"
#include "platform/posix/CodeBundleInformation.h"
#include "tests/platform/SampleBundle.h"

namespace platform {
namespace {

propertylist::Dictionary goodInformationWith(std::string_view key,
                                             const std::optional<propertylist::Value>& value) {
  propertylist::Dictionary information = SampleBundle::goodInformation();
  if (value)
    information.set(key, *value);
  else
    information.remove(key);
  return information;
}

TEST(CodeBundle, OffersItsPrincipalClassAsAMigrator) {
  const SampleBundle bundle;
  ProcessClassRegistry registry;
  const CodeBundlePtr loaded = registry.loadCodeBundle(bundle.path());
  ASSERT_NE(loaded, nullptr);
  auto* offered = dynamic_cast<DataClassMigratorClass*>(
      registry.classNamed(loaded->principalClassName().value()));
  ASSERT_NE(offered, nullptr);
  EXPECT_EQ(offered->create()->dataClassName(), "sample");
}

TEST(CodeBundle, MayNameNoPrincipalClass) {
  const SampleBundle bundle(goodInformationWith("PrincipalClass", std::nullopt));
  const CodeBundlePtr loaded = ProcessClassRegistry().loadCodeBundle(bundle.path());
  ASSERT_NE(loaded, nullptr);
  EXPECT_EQ(loaded->principalClassName(), std::nullopt);
}

TEST(CodeBundle, IsNotLoadedWhenItsInformationIsWrong) {
  const struct {
    const char* name;
    const char* key;
    std::optional<propertylist::Value> value;
  } kCases[] = {
      {"no executable", "Executable", std::nullopt},
      {"executable of another kind", "Executable", 1},
      {"empty executable", "Executable", ""},
      {"missing executable", "Executable", "Missing"},
      {"executable elsewhere", "Executable", SAMPLE_BUNDLE_CODE},
      {"executable below", "Executable", "./SampleBundle"},
      {"executable above", "Executable", ".."},
      {"executable with NUL", "Executable", std::string("SampleBundle\0", 13)},
      {"executable that is no code", "Executable", "Info.plist"},
      {"no interface version", "PlatformInterfaceVersion", std::nullopt},
      {"other interface version", "PlatformInterfaceVersion", 2},
      {"interface version of another kind", "PlatformInterfaceVersion", "1"},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(c.name);
    const SampleBundle bundle(goodInformationWith(c.key, c.value));
    EXPECT_EQ(ProcessClassRegistry().loadCodeBundle(bundle.path()), nullptr);
  }
  EXPECT_EQ(registeredClass("BundleClass"), nullptr);
}

TEST(CodeBundle, IsNotLoadedWithoutReadableInformation) {
  const SampleBundle bundle;
  std::ofstream(bundle.path() + "/Info.plist") << "no property list";
  EXPECT_EQ(ProcessClassRegistry().loadCodeBundle(bundle.path()), nullptr);
  std::filesystem::remove(bundle.path() + "/Info.plist");
  EXPECT_EQ(ProcessClassRegistry().loadCodeBundle(bundle.path()), nullptr);
}

TEST(CodeBundleInformation, SaysWhatTheBundleIs) {
  const SampleBundle bundle;
  const auto read = readCodeBundleInformation(bundle.path());
  EXPECT_EQ(read.error, "");
  ASSERT_TRUE(read.information.has_value());
  EXPECT_EQ(read.information->executablePath, bundle.path() + "/SampleBundle");
  EXPECT_EQ(read.information->principalClass, "BundleClass");
  EXPECT_EQ(read.information->identifier, "com.vantor.SampleBundle");
  EXPECT_EQ(read.information->kind, "DataClassMigrator");
  EXPECT_EQ(read.information->platformInterfaceVersion, 1);
}

TEST(CodeBundleInformation, NamesTheFileThatIsWrong) {
  const SampleBundle bundle(goodInformationWith("Executable", "../elsewhere"));
  const auto read = readCodeBundleInformation(bundle.path());
  EXPECT_FALSE(read.information.has_value());
  EXPECT_EQ(read.error, "\"Executable\" in " + bundle.path() +
                            "/Info.plist is not the name of a file in the bundle");
  const auto missing = readCodeBundleInformation("/no/such.migrator");
  EXPECT_FALSE(missing.information.has_value());
  EXPECT_TRUE(missing.error.starts_with("/no/such.migrator/Info.plist cannot be read: "))
      << missing.error;
}

TEST(LoadLibrary, NeedsEverySymbolResolved) {
  const auto reason = ProcessClassRegistry().loadLibrary(UNRESOLVED_LIBRARY);
  ASSERT_TRUE(reason.has_value());
  EXPECT_NE(reason->find("a_function_that_nobody_defines"), std::string::npos) << *reason;
}

TEST(LoadLibrary, TakesABareNameForAFileOfTheCurrentDirectory) {
  EXPECT_TRUE(ProcessClassRegistry().loadLibrary("libc.so.6").has_value());
  std::filesystem::current_path(std::filesystem::path(SAMPLE_LIBRARY).parent_path());
  EXPECT_EQ(ProcessClassRegistry().loadLibrary(std::filesystem::path(SAMPLE_LIBRARY).filename()),
            std::nullopt);
}

}  // namespace
}  // namespace platform
