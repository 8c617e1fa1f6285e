#include "tools/migration-host/CommandLine.h"

#include <CLI/CLI.hpp>

namespace migration_host {
namespace {

constexpr const char* kDescription =
    "Runs data-class migrators on a device image, each in a process of its own, and\n"
    "reports what became of every account and record.";

constexpr const char* kFooter = R"(Examples:
  migration-host run --image /srv/images/ada
      runs the installed migrator, then those of the image, and prints a table
  migration-host run --image ada --json --quiet > report.json
      prints the report for programs
  migration-host run --image ada --bundle ./Other.migrator --timeout 60
      runs one migrator alone and stops it after a minute
  migration-host run --image old --legacy
      makes a settings file of legacy files or of an older one first

Exit codes: 0 done and verified; 1 unexpected failure; 2 wrong usage; 3 done, but
records or accounts were left behind; 5 verification failed; 7 a check before the
start refused, nothing was written; 8 a migrator crashed, raised or ran past its
limit; 11 another run holds the image; 130 interrupted.)";

}  // namespace

ParsedCommandLine parseCommandLine(int argumentCount, char** arguments) {
  CLI::App application(kDescription, "migration-host");
  application.footer(kFooter);
  application.set_version_flag("--version", "migration-host " PROJECT_VERSION_TEXT);
  application.require_subcommand(1);

  CommandLine command;
  long long seconds = kStandardLimit.count();
  CLI::App* run = application.add_subcommand("run", "Migrate a device image");
  run->footer(kFooter);
  run->add_option("--image", command.image, "The device image's directory")->required();
  run->add_option("--bundle", command.bundle, "Run only the migrator in this folder");
  run->add_flag("--legacy", command.legacy,
                "First make the settings file of what older systems left, if they did");
  run->add_flag("--json", command.json, "Print the report as JSON, and nothing else");
  run->add_option("--log", command.logFile, "Write the migrators' log lines to this file too");
  run->add_option("--timeout", seconds,
                  "Stop a migrator after this many seconds; with --legacy, waiting for the "
                  "migration lock counts")
      ->capture_default_str()
      ->check(CLI::Range(1LL, static_cast<long long>(kLongestLimit.count())));
  run->add_flag("--quiet", command.quiet, "Show no log lines and no progress");
  try {
    application.parse(argumentCount, arguments);
  } catch (const CLI::Success& printed) {
    return {std::nullopt, application.exit(printed)};
  } catch (const CLI::ParseError& error) {
    application.exit(error);
    return {std::nullopt, kExitWrongUsage};
  }
  command.limit = std::chrono::seconds(seconds);
  return {std::move(command), 0};
}

}  // namespace migration_host
