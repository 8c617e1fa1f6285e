#include "host/MigratorChild.h"

#include <memory>
#include <string_view>

#include "host/ChildProcess.h"
#include "host/UnusableDatabases.h"
#include "platform/DataClassMigrator.h"
#include "platform/Services.h"

namespace host {
namespace {

int loadAndRun(const std::string& folder, const std::string& executable,
               const std::string& principalClass) {
  platform::ClassRegistry& registry = platform::services().classRegistry;
  // The library first, because it alone says what is wrong with it.
  if (const auto error = registry.loadLibrary(executable)) return tellNotLoaded(*error);
  const platform::CodeBundlePtr bundle = registry.loadCodeBundle(folder);
  if (!bundle) return tellNotLoaded(folder + " could not be loaded");
  auto* migratorClass =
      dynamic_cast<platform::DataClassMigratorClass*>(registry.classNamed(principalClass));
  if (migratorClass == nullptr)
    return tellNotLoaded(executable + " offers no migrator class named " + principalClass);
  const std::unique_ptr<platform::DataClassMigrator> migrator = migratorClass->create();
  if (!migrator) return tellNotLoaded(principalClass + " made no migrator");
  tellName(migrator->dataClassName());
  return tellEnd(migrator->performMigration());
}

}  // namespace

bool isMigratorProcess(int argumentCount, char** arguments) {
  return argumentCount == kRunMigratorArgumentCount &&
         std::string_view(arguments[1]) == kRunMigratorArgument;
}

int runMigratorInThisProcess(char** arguments) {
  ChildOptions options;
  options.databasesLeftAlone = pathsJoinedIn(arguments[6]);
  return workForHost(
      arguments[2],
      [&](const deviceimage::DeviceImage&) {
        return loadAndRun(arguments[3], arguments[4], arguments[5]);
      },
      options);
}

}  // namespace host
