#pragma once

#include <string>

#include "platform/ClassRegistry.h"
#include "tests/contracts/Port.h"

// One device with a code bundle and a library that are not loaded. The registry is the process's,
// and the code stays loaded: every test needs a process of its own.
class ClassRegistryUnderTest {
 public:
  virtual ~ClassRegistryUnderTest() = default;
  virtual platform::ClassRegistry& service() = 0;
  // A bundle whose principal class is "BundleClass", which its code registers.
  virtual std::string bundlePath() = 0;
  // A library that registers "LibraryClass".
  virtual std::string libraryPath() = 0;
};
using ClassRegistryPort = Port<ClassRegistryUnderTest>;

class ClassRegistryContract : public Contract<ClassRegistryUnderTest> {
 protected:
  platform::ClassRegistry& service() { return device->service(); }
  std::string classNameOf(std::string_view name) {
    platform::RuntimeClass* found = service().classNamed(name);
    return found == nullptr ? "none" : found->className();
  }
};

TEST_P(ClassRegistryContract, FindsAClassThatTheProcessRegistered) {
  struct Registered : platform::RuntimeClass {
    std::string className() const override { return "RegisteredByTheTest"; }
  };
  static Registered registered;
  EXPECT_EQ(service().classNamed("RegisteredByTheTest"), nullptr);
  platform::registerClass(registered);
  EXPECT_EQ(service().classNamed("RegisteredByTheTest"), &registered);
  EXPECT_EQ(service().classNamed("registeredbythetest"), nullptr);
  EXPECT_EQ(service().classNamed(""), nullptr);
}

TEST_P(ClassRegistryContract, FindsTheClassesOfABundleOnceItIsLoaded) {
  EXPECT_EQ(classNameOf("BundleClass"), "none");
  const auto bundle = service().loadCodeBundle(device->bundlePath());
  ASSERT_NE(bundle, nullptr);
  EXPECT_EQ(bundle->principalClassName(), "BundleClass");
  EXPECT_EQ(classNameOf("BundleClass"), "BundleClass");
  platform::RuntimeClass* first = service().classNamed("BundleClass");
  EXPECT_NE(service().loadCodeBundle(device->bundlePath()), nullptr);
  EXPECT_EQ(service().classNamed("BundleClass"), first);
}

TEST_P(ClassRegistryContract, FindsTheClassesOfALibraryOnceItIsLoaded) {
  EXPECT_EQ(classNameOf("LibraryClass"), "none");
  EXPECT_EQ(service().loadLibrary(device->libraryPath()), std::nullopt);
  EXPECT_EQ(service().loadLibrary(device->libraryPath()), std::nullopt);
  EXPECT_EQ(classNameOf("LibraryClass"), "LibraryClass");
}

TEST_P(ClassRegistryContract, SaysWhyALibraryCannotBeLoaded) {
  for (const std::string& path : {device->libraryPath() + "-missing", std::string()}) {
    const auto reason = service().loadLibrary(path);
    ASSERT_TRUE(reason.has_value());
    EXPECT_NE(*reason, "");
  }
}

TEST_P(ClassRegistryContract, LoadsNoBundleThatIsNotThere) {
  EXPECT_EQ(service().loadCodeBundle(device->bundlePath() + "-missing"), nullptr);
  EXPECT_EQ(service().loadCodeBundle(""), nullptr);
}
