#pragma once

#include <memory>
#include <string>

#include "platform/ClassRegistry.h"
#include "platform/DataClassMigrator.h"
#include "platform/SystemLog.h"

// A bundle for the host's tests: performMigration runs the bundle's own `migrate`.
bool migrate();

namespace {

class TestMigrator : public platform::DataClassMigrator {
 public:
  std::string dataClassName() override { return "Test Migrator"; }
  bool performMigration() override { return migrate(); }
};

class TestMigratorClass : public platform::DataClassMigratorClass {
 public:
  std::string className() const override { return "TestMigrator"; }
  std::unique_ptr<platform::DataClassMigrator> create() override {
    return std::make_unique<TestMigrator>();
  }
};

TestMigratorClass testMigratorClass;

[[maybe_unused]] const bool isRegistered = [] {
  platform::registerClass(testMigratorClass);
  return true;
}();

}  // namespace
