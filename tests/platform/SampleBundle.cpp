#include "tests/platform/SampleBundle.h"

#include <filesystem>
#include <fstream>
#include <stdexcept>

#include "platform/posix/ProcessClassRegistry.h"
#include "propertylist/Writing.h"

namespace {

constexpr const char* kExecutable = "SampleBundle";

}  // namespace

SampleBundle::SampleBundle() : SampleBundle(goodInformation()) {}

SampleBundle::SampleBundle(const propertylist::Dictionary& information) {
  std::filesystem::copy_file(SAMPLE_BUNDLE_CODE, path() + "/" + kExecutable);
  const propertylist::Bytes list = propertylist::writeBinaryPropertyList(information).value();
  std::ofstream(path() + "/Info.plist", std::fstream::binary)
      << std::string(list.begin(), list.end());
}

propertylist::Dictionary SampleBundle::goodInformation() {
  return {{"Executable", kExecutable},
          {"PrincipalClass", "BundleClass"},
          {"BundleIdentifier", "com.vantor.SampleBundle"},
          {"Kind", "DataClassMigrator"},
          {"PlatformInterfaceVersion", 1}};
}

const void* SampleBundle::load() const {
  platform::ProcessClassRegistry registry;
  if (registry.loadCodeBundle(path()) == nullptr) throw std::runtime_error("cannot load " + path());
  return registry.classNamed("BundleClass");  // the class object is part of the bundle's data
}
