#pragma once

#include <chrono>
#include <optional>
#include <string>

namespace migration_host {

inline constexpr int kExitWrongUsage = 2;
inline constexpr std::chrono::seconds kStandardLimit{3600};
inline constexpr std::chrono::seconds kLongestLimit{7 * 24 * 3600};

// What the user asks for. docs/man/migration-host.1 describes it.
struct CommandLine {
  std::string image;
  std::optional<std::string> bundle;
  std::optional<std::string> logFile;
  std::chrono::seconds limit = kStandardLimit;
  bool legacy = false;
  bool json = false;
  bool quiet = false;
};

// Either what is to be done, or the exit code when there is nothing to do but what has been
// printed: help, the version, or what was wrong with the arguments.
struct ParsedCommandLine {
  std::optional<CommandLine> command;
  int exitCode = 0;
};
ParsedCommandLine parseCommandLine(int argumentCount, char** arguments);

}  // namespace migration_host
