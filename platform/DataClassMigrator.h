#pragma once

#include <memory>
#include <string>

#include "platform/ClassRegistry.h"
#include "platform/Export.h"

namespace platform {

// A migrator plug-in as the migration host sees it. The host makes one object, may ask for its
// name, and calls performMigration once, all on one thread.
class PLATFORM_EXPORT DataClassMigrator {
 public:
  virtual ~DataClassMigrator();
  // The name under which the host lists and logs the migrator; the same every time.
  virtual std::string dataClassName() = 0;
  // Runs the whole migration; false when it failed as a whole.
  virtual bool performMigration() = 0;
};

// The class object of a migrator. A bundle registers one under the principal class name of its
// Info.plist when it is loaded.
class PLATFORM_EXPORT DataClassMigratorClass : public RuntimeClass {
 public:
  ~DataClassMigratorClass() override;
  virtual std::unique_ptr<DataClassMigrator> create() = 0;
};

// The generation of the interfaces in this folder. A bundle names the one it was built for in its
// Info.plist; the host loads no bundle of another generation.
inline constexpr int kPlatformInterfaceVersion = 1;

}  // namespace platform
