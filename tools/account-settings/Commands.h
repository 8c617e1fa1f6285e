#pragma once

#include <CLI/CLI.hpp>

#include "tools/common/ExitCode.h"

namespace tools {

// Each function adds one command to `app`: its options, its help and, as the callback that the
// parser calls when the command line names it, its work. The callback sets `outcome` or throws a
// CommandFailure. `outcome` outlives the parsing.
void addListCommand(CLI::App& app, ExitCode& outcome);
void addShowCommand(CLI::App& app, ExitCode& outcome);
void addEnableCommand(CLI::App& app, ExitCode& outcome);
void addDisableCommand(CLI::App& app, ExitCode& outcome);
void addSetCommand(CLI::App& app, ExitCode& outcome);
void addUnsetCommand(CLI::App& app, ExitCode& outcome);
void addInsertCommand(CLI::App& app, ExitCode& outcome);
void addDeleteCommand(CLI::App& app, ExitCode& outcome);
void addAddChildCommand(CLI::App& app, ExitCode& outcome);
void addRemoveChildCommand(CLI::App& app, ExitCode& outcome);
void addValidateCommand(CLI::App& app, ExitCode& outcome);
void addConvertCommand(CLI::App& app, ExitCode& outcome);
void addExplainMergeCommand(CLI::App& app, ExitCode& outcome);
void addMigrateLegacyCommand(CLI::App& app, ExitCode& outcome);
void addWaitForMigrationCommand(CLI::App& app, ExitCode& outcome);
void addStopDaemonCommand(CLI::App& app, ExitCode& outcome);

// Whether the program was started by migrate-legacy, for the process that migrates; and what that
// process does. Gives its exit status.
bool isLegacyMigrationProcess(int argumentCount, char** arguments);
int migrateLegacyInThisProcess(char** arguments);

}  // namespace tools
