#pragma once

#include <string>

#include "platform/ClassRegistry.h"

// A plug-in with an account settings library of its own, as the migrator is one.
class PLATFORM_EXPORT StorePlugin {
 public:
  virtual ~StorePlugin() = default;
  // Renames an account of the device, saves, and has the notifiers told.
  virtual void renameAndNotify(const std::string& identifier, const std::string& name) = 0;
  virtual bool refresh(const std::string& identifier, const std::string& dataclass) = 0;
  // What the plug-in finds under the name.
  virtual platform::RuntimeClass* classNamed(const std::string& name) = 0;
};
