#pragma once

namespace tools {

// The argument with which migrate-legacy starts the program anew, for the process that migrates.
// The starter holds the migration lock meanwhile; without anybody who does, that process refuses.
inline constexpr const char* kLegacyMigrationArgument = "--migrate-legacy-settings-in-this-process";

}  // namespace tools
