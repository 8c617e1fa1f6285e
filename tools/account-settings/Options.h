#pragma once

#include <CLI/CLI.hpp>
#include <string>

namespace tools {

// What every command that looks at an image is told.
struct LookOptions {
  std::string image;
  bool json = false;
};
void addLookOptions(CLI::App& command, LookOptions& options);

// The account that a command is about, with a help text of its own; an empty one is wrong usage.
void addIdentifier(CLI::App& command, const std::string& name, std::string& identifier,
                   const std::string& help);

// An option that takes a number of seconds, `shortest` or more.
CLI::Option* addSeconds(CLI::App& command, const std::string& name, double& seconds,
                        double shortest, const std::string& help);

// What every command that changes a settings file is told.
struct ChangeOptions : LookOptions {
  bool lock = true;     // hold the image's lock from the reading to the writing
  double wait = 10;     // seconds for which a lock that another run holds is waited for
  bool notify = false;  // tell the notifiers of the service bundles
  bool dryRun = false;
};
void addWait(CLI::App& command, double& wait);  // the option --wait
void addChangeOptions(CLI::App& command, ChangeOptions& options);

}  // namespace tools
