#pragma once

#include "platform/ClassRegistry.h"

namespace platform {

// The classes that are registered in this process, and code that the dynamic loader loads. Nothing
// is ever unloaded: what a bundle registered would die with it.
//
// Code is loaded with all its symbols resolved and kept out of the lookup of later objects: bundles
// share the platform library, through which they register, and nothing else.
class PLATFORM_EXPORT ProcessClassRegistry : public ClassRegistry {
 public:
  RuntimeClass* classNamed(std::string_view name) override;
  // Empty too when the bundle was built for another generation of the platform's interfaces than
  // kPlatformInterfaceVersion. Registered classes are not looked at: the principal class may be
  // missing.
  CodeBundlePtr loadCodeBundle(const std::string& path) override;
  // A `path` without a "/" is a file in the current directory, not a library of the system.
  std::optional<std::string> loadLibrary(const std::string& path) override;
};

}  // namespace platform
