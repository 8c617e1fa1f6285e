#include <fmt/format.h>

#include <algorithm>
#include <memory>
#include <string_view>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "host/ChildProcess.h"
#include "host/LegacyStep.h"
#include "host/ProcessTree.h"
#include "host/Settings.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/ImageAccess.h"
#include "tools/account-settings/Options.h"
#include "tools/account-settings/Shown.h"
#include "tools/account-settings/TimeLimit.h"
#include "tools/common/Images.h"
#include "tools/common/Program.h"
#include "tools/common/Text.h"

namespace tools {
namespace {

using accountsettings::ASSAccountsManager;
using deviceimage::DeviceImage;

constexpr const char* kChildArgument = "--migrate-legacy-settings-in-this-process";
constexpr double kShortestWait = 0.1;    // seconds
constexpr double kStandardLimit = 3600;  // seconds

struct Options : LookOptions {
  double wait = 10;
  double timeout = kStandardLimit;
};

// Programs that migrate without the image's lock exclude each other by the library's.
void waitForMigrationLock(const ImagePtr& image, double wait) {
  const deviceimage::DeviceImageServices services(image);
  platform::install(services.services());
  const TimeLimit limit(
      std::max(wait, kShortestWait),
      {ExitCode::heldByAnotherRun,
       {},
       messageLine(fmt::format("{}: another program migrates the settings; nothing was changed; "
                               "wait until it has ended (waited {} seconds; --wait gives another "
                               "time)",
                               image->rootPath(), wait))});
  waitForOtherMigrations(*image);
}

// The lines of the log, which people see as they come.
struct Log {
  bool shows = false;
  std::vector<std::string> lines;
  void take(std::string_view line) {
    if (shows) printMessage(line);
    lines.emplace_back(line);
  }
};

host::LegacyReport migrate(const ImagePtr& image, const Options& options, Log& log) {
  const auto lock = takeLock(*image, options.wait);
  useTemporaryDirectory(*image);
  if (host::legacyNeedOf(*image).any()) waitForMigrationLock(image, options.wait);
  if (!host::adoptOrphans())
    throw CommandFailure(ExitCode::refused,
                         "the system does not let this program find what a migrator leaves "
                         "running; nothing was changed; run it outside of the sandbox that forbids "
                         "it");
  host::Interruption interruption;
  const auto limit =
      std::chrono::ceil<std::chrono::seconds>(std::chrono::duration<double>(options.timeout));
  return host::runLegacyStep(*image, {kChildArgument, lock->descriptor(), limit}, interruption,
                             [&](std::string_view line) { log.take(line); });
}

void printAsJson(const DeviceImage& image, const host::LegacyReport& report, const Log& log) {
  nlohmann::json json;
  json["image"] = image.rootPath();
  json["result"] = host::resultOf(report);
  json["mail_accounts"] = report.need.mailAccounts;
  json["data_access"] = report.need.dataAccess;
  json["older_version"] = report.need.olderVersion;
  json["settings"] = host::nameOf(report.settings);
  json["accounts"] = host::readSettings(image).accounts.size();
  json["kept_copies"] = report.keptSettings;
  json["reasons"] = report.reasons;
  json["log"] = log.lines;
  printJson(json);
}

void printAsText(const DeviceImage& image, const host::LegacyReport& report) {
  const std::size_t count = host::readSettings(image).accounts.size();
  if (!report.migrator)
    fmt::print("nothing to migrate\n");
  else
    fmt::print("{}: {}, {} account{}\n", forTerminal(image.settingsFile()), host::describe(report),
               count, count == 1 ? "" : "s");
  for (const std::string& copy : report.keptSettings)
    fmt::print("{}: kept from before a migration\n", forTerminal(copy));
}

std::string joined(const std::vector<std::string>& sentences) {
  std::string text;
  for (const std::string& sentence : sentences) text += (text.empty() ? "" : " ") + sentence;
  return text;
}

ExitCode run(const Options& options) {
  const ImagePtr image = openImage(options.image);
  Log log{.shows = !options.json, .lines = {}};
  const host::LegacyReport report = migrate(image, options, log);
  if (options.json)
    printAsJson(*image, report, log);
  else if (report.isDone())
    printAsText(*image, report);
  if (report.isDone()) return ExitCode::done;
  if (!report.migrator) throw CommandFailure(ExitCode::refused, joined(report.reasons));
  throw CommandFailure(
      ExitCode::unexpectedFailure,
      fmt::format("{} The legacy files are as they were; mend what the lines above "
                  "and {} tell of, and repeat the command",
                  joined(report.reasons), image->systemLogFile()));
}

}  // namespace

void addMigrateLegacyCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand(
      "migrate-legacy", "Make a settings file of what older systems left behind");
  addLookOptions(*command, *options);
  addWait(*command, options->wait);
  addSeconds(*command, "--timeout", options->timeout, 1,
             "Stop the image's accounts data migrator after this time (3600)");
  command->footer(
      "Runs the code of the image's AccountMigrator.migrator. Legacy files stay, and the settings\n"
      "file is built anew of them each time; the one before is kept beside it under a name with\n"
      "\".before-migration-\" and a number.\n\n"
      "Example:\n  account-settings migrate-legacy --image my-device");
  command->callback([options, &outcome] { outcome = run(*options); });
}

bool isLegacyMigrationProcess(int argumentCount, char** arguments) {
  return argumentCount == 3 && std::string_view(arguments[1]) == kChildArgument;
}

int migrateLegacyInThisProcess(char** arguments) {
  bool hasFailed = false;  // the library says so in its line alone
  return host::workForHost(arguments[2],
                           [&](const DeviceImage& /*image*/) {
                             ASSAccountsManager::_migrateAccountsIfNeeded();
                             return host::tellEnd(!hasFailed);
                           },
                           {"account-settings", [&](std::string_view line) {
                              hasFailed =
                                  hasFailed || line.ends_with("] Accounts migration failed");
                            }});
}

}  // namespace tools
