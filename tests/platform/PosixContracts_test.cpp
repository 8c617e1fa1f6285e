// The services for any POSIX system, run through the contracts.

#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <utility>

#include "platform/posix/DlAddrBundleResources.h"
#include "platform/posix/MonotonicClock.h"
#include "platform/posix/PosixFileServices.h"
#include "platform/posix/ProcessClassRegistry.h"
#include "platform/posix/RandomUUIDGenerator.h"
#include "platform/testing/TemporaryDirectory.h"
#include "tests/contracts/BundleResourcesContract.h"
#include "tests/contracts/ClassRegistryContract.h"
#include "tests/contracts/ClockContract.h"
#include "tests/contracts/FileServicesContract.h"
#include "tests/contracts/UUIDGeneratorContract.h"
#include "tests/platform/SampleBundle.h"

namespace {

using testing::Values;

class PosixFiles : public FileServicesUnderTest {
 public:
  platform::FileServices& service() override { return _service; }
  std::string directory() override { return _directory.path(); }

 private:
  platform::TemporaryDirectory _directory;
  platform::PosixFileServices _service;
};
INSTANTIATE_TEST_SUITE_P(Posix, FileServicesContract, Values(portOf<PosixFiles>("Posix")));

class ProcessClasses : public ClassRegistryUnderTest {
 public:
  platform::ClassRegistry& service() override { return _service; }
  std::string bundlePath() override { return _bundle.path(); }
  std::string libraryPath() override { return SAMPLE_LIBRARY; }

 private:
  SampleBundle _bundle;
  platform::ProcessClassRegistry _service;
};
INSTANTIATE_TEST_SUITE_P(Posix, ClassRegistryContract, Values(portOf<ProcessClasses>("Posix")));

// A bundle's folder with resources, reached by the derived class's way.
class ResourcesInAFolder : public BundleResourcesUnderTest {
 public:
  void addFile(const std::string& fileName, const std::string& content) override {
    std::ofstream(folder() + "/" + fileName, std::fstream::binary) << content;
  }
  void addText(const std::string& language, const std::string& table, const std::string& key,
               const std::string& text) override {
    const std::string name = language + ".lproj";
    std::filesystem::create_directories(folder() + "/" + name);
    addFile(name + "/" + table + ".strings",
            "<?xml version=\"1.0\" encoding=\"UTF-8\"?><plist version=\"1.0\"><dict><key>" + key +
                "</key><string>" + text + "</string></dict></plist>");
  }
  std::string contentOf(const std::string& path) override {
    std::ifstream file(path, std::fstream::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }

 protected:
  virtual std::string folder() = 0;
  std::unique_ptr<platform::DlAddrBundleResources> _service;
};

class ResourcesOfAProgram : public ResourcesInAFolder {
 public:
  platform::BundleResources& serviceForLanguages(std::vector<std::string> languages) override {
    _service = std::make_unique<platform::DlAddrBundleResources>(languages, folder());
    return *_service;
  }
  const void* code() override { return nullptr; }

 protected:
  std::string folder() override { return _directory.path(); }

 private:
  platform::TemporaryDirectory _directory;
};

class ResourcesOfALoadedBundle : public ResourcesInAFolder {
 public:
  platform::BundleResources& serviceForLanguages(std::vector<std::string> languages) override {
    _service = std::make_unique<platform::DlAddrBundleResources>(languages);
    return *_service;
  }
  const void* code() override { return _bundle.load(); }

 protected:
  std::string folder() override { return _bundle.path(); }

 private:
  SampleBundle _bundle;
};
INSTANTIATE_TEST_SUITE_P(Posix, BundleResourcesContract,
                         Values(portOf<ResourcesOfAProgram>("OfAProgram"),
                                portOf<ResourcesOfALoadedBundle>("OfALoadedBundle")));

class RandomUUIDs : public UUIDGeneratorUnderTest {
 public:
  platform::UUIDGenerator& service() override { return _service; }

 private:
  platform::RandomUUIDGenerator _service;
};
INSTANTIATE_TEST_SUITE_P(Posix, UUIDGeneratorContract, Values(portOf<RandomUUIDs>("Posix")));

class MonotonicTime : public ClockUnderTest {
 public:
  platform::Clock& service() override { return _service; }

 private:
  platform::MonotonicClock _service;
};
INSTANTIATE_TEST_SUITE_P(Posix, ClockContract, Values(portOf<MonotonicTime>("Posix")));

}  // namespace
