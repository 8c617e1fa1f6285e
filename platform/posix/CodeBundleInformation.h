#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "platform/Export.h"

namespace platform {

// What the Info.plist in a code bundle's folder says. A key that is missing or of another kind than
// it must be counts as absent.
struct CodeBundleInformation {
  std::string executablePath;  // "Executable", a plain file name, in the bundle's folder
  std::optional<std::string> principalClass;  // "PrincipalClass"
  std::optional<std::string> identifier;      // "BundleIdentifier"
  std::optional<std::string> kind;            // "Kind": "DataClassMigrator" for a migrator
  std::optional<std::int64_t> platformInterfaceVersion;  // "PlatformInterfaceVersion"
};

struct ReadCodeBundleInformation {
  std::optional<CodeBundleInformation> information;
  std::string error;  // one sentence that names the file; empty exactly when there is information
};

// Reads the Info.plist of the bundle whose folder is at `bundlePath`. Fails when there is none, or
// when its "Executable" is missing or leads out of the folder.
PLATFORM_EXPORT ReadCodeBundleInformation readCodeBundleInformation(const std::string& bundlePath);

}  // namespace platform
