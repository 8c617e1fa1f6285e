// The command line of the migration host.
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <string>

#include "host/MigrationHost.h"
#include "host/MigratorChild.h"
#include "tools/common/Installation.h"
#include "tools/migration-host/CommandLine.h"
#include "tools/migration-host/JsonReport.h"
#include "tools/migration-host/Terminal.h"
#include "tools/migration-host/TextReport.h"

namespace {

using namespace migration_host;

bool print(const std::string& text) {
  return std::fwrite(text.data(), 1, text.size(), stdout) == text.size() &&
         std::fflush(stdout) == 0;
}

// Makes a failure of a run that was done, but for what cannot be written.
void fail(host::MigrationReport& report) {
  if (report.outcome == host::RunOutcome::done || report.outcome == host::RunOutcome::leftBehind)
    report.outcome = host::RunOutcome::failed;
}

int run(const CommandLine& command) {
  // A reader of the output that goes away does not stop a migration.
  std::signal(SIGPIPE, SIG_IGN);
  Terminal terminal(command.quiet);
  if (command.logFile) {
    const std::string problem = terminal.openLogFile(*command.logFile);
    if (!problem.empty()) {
      std::fprintf(stderr, "migration-host: %s\n", printable(problem).c_str());
      return kExitWrongUsage;
    }
  }
  host::MigrationReport report;
  {
    host::Interruption interruption;
    report = host::MigrationHost(terminal, interruption)
                 .run({command.image, command.bundle, tools::installedMigrators(), command.limit,
                       command.legacy});
  }
  terminal.stageEnded();
  const std::string logProblem = terminal.closeLogFile();
  if (!logProblem.empty()) {
    std::fprintf(stderr, "migration-host: %s\n", logProblem.c_str());
    report.reasons.push_back(logProblem);
    fail(report);
  }
  const bool colours = isatty(STDOUT_FILENO) != 0;
  // When nobody can have read the report, it lists nothing.
  if (!print(command.json ? jsonReport(report) : textReport(report, colours))) fail(report);
  return static_cast<int>(report.outcome);
}

}  // namespace

int main(int argumentCount, char** arguments) {
  if (host::isMigratorProcess(argumentCount, arguments))
    return host::runMigratorInThisProcess(arguments);
  if (host::isLegacyProcess(argumentCount, arguments))
    return host::migrateLegacyInThisProcess(arguments);
  const ParsedCommandLine parsed = parseCommandLine(argumentCount, arguments);
  if (!parsed.command) return parsed.exitCode;
  try {
    return run(*parsed.command);
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "migration-host: unexpected failure: %s\n", exception.what());
    return EXIT_FAILURE;
  }
}
