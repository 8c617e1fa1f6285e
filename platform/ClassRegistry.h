#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/Export.h"

namespace platform {

// A class that code bundles offer by name. What it can do is asked at run time: the class object
// may implement further interfaces (DataClassMigratorClass, creator and notifier interfaces), and
// asking is a dynamic_cast.
class PLATFORM_EXPORT RuntimeClass {
 public:
  virtual ~RuntimeClass();
  virtual std::string className() const = 0;
};

// A code bundle that has been loaded. A bundle, once loaded, stays loaded.
class PLATFORM_EXPORT CodeBundle {
 public:
  virtual ~CodeBundle();
  // The name of the class that the bundle's Info.plist calls its principal one; empty when it names
  // none.
  virtual std::optional<std::string> principalClassName() const = 0;
};
using CodeBundlePtr = std::shared_ptr<CodeBundle>;

// Finds classes by name and loads the code that defines them. Any thread.
class PLATFORM_EXPORT ClassRegistry {
 public:
  virtual ~ClassRegistry();
  // The class registered under `name`, or null. It lives until the process ends.
  virtual RuntimeClass* classNamed(std::string_view name) = 0;
  // Loads the bundle whose folder is at `path` with all its symbols resolved; empty when that
  // fails.
  virtual CodeBundlePtr loadCodeBundle(const std::string& path) = 0;
  // Loads the shared object at `path` with all its symbols resolved. Empty on success, else the
  // loader's text. Loading what is loaded costs nothing.
  virtual std::optional<std::string> loadLibrary(const std::string& path) = 0;
};

// Registers `registered` for the whole process. Of one name the first is answered; a later one is
// kept as long and never answered.
// `registered` is never destroyed: it is answered until the process is gone, also to what runs at
// its exit. So make it with new; an object of static storage is destroyed before that. Code bundles
// call it while they are loaded, so it works before any service is installed.
PLATFORM_EXPORT void registerClass(RuntimeClass& registered);
// The class registered under `name` in this process, or null.
PLATFORM_EXPORT RuntimeClass* registeredClass(std::string_view name);

}  // namespace platform
