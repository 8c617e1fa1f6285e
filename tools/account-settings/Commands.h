#pragma once

#include <CLI/CLI.hpp>

#include "tools/common/ExitCode.h"

namespace tools {

// Each function adds one command to `app`: its options, its help and, as the callback that the
// parser calls when the command line names it, its work. The callback sets `outcome` or throws a
// CommandFailure. `outcome` outlives the parsing.
void addListCommand(CLI::App& app, ExitCode& outcome);
void addShowCommand(CLI::App& app, ExitCode& outcome);
void addSetCommand(CLI::App& app, ExitCode& outcome);
void addUnsetCommand(CLI::App& app, ExitCode& outcome);

}  // namespace tools
