// A code bundle's code: registers its principal class while it is loaded. The registered name is
// given by the build.

#include "platform/DataClassMigrator.h"

namespace {

class SampleMigrator : public platform::DataClassMigrator {
 public:
  std::string dataClassName() override { return "sample"; }
  bool performMigration() override { return true; }
};

class SampleClass : public platform::DataClassMigratorClass {
 public:
  SampleClass() { platform::registerClass(*this); }
  std::string className() const override { return SAMPLE_CLASS; }
  std::unique_ptr<platform::DataClassMigrator> create() override {
    return std::make_unique<SampleMigrator>();
  }
};

SampleClass sampleClass;

}  // namespace
