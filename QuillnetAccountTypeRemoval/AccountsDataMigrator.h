#pragma once

#include <memory>

#include "platform/Export.h"

namespace accountsettings {

// The device's own component that turns what older systems left behind into a settings file of the
// current version: builds one from the legacy files, or brings an older one up to date. The store's
// library runs it under the migration lock, once per process, and drops it.
class PLATFORM_EXPORT AccountsDataMigrator {
 public:
  virtual ~AccountsDataMigrator() = default;
  // Does the whole work; false when it failed. What is not migrated then is tried again by the next
  // process.
  virtual bool executeMigrationSteps() = 0;
};

// What the class "AccountsDataMigrator" offers. The bundle registers an object that is a
// platform::RuntimeClass of that name and implements this too.
class PLATFORM_EXPORT AccountsDataMigratorClass {
 public:
  virtual ~AccountsDataMigratorClass() = default;
  // Null when none can be made.
  virtual std::unique_ptr<AccountsDataMigrator> init() = 0;
};

}  // namespace accountsettings
