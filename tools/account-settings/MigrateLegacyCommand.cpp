#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "host/LegacyStep.h"
#include "host/ProcessTree.h"
#include "host/Settings.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/ImageAccess.h"
#include "tools/account-settings/LegacyMigrationProcess.h"
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

constexpr double kShortestWait = 0.1;    // seconds
constexpr double kStandardLimit = 3600;  // seconds
// An answer stays readable whatever a migrator writes; the image's system log has every line.
constexpr std::size_t kMaximumLogSize = std::size_t{64} << 20U;  // bytes
constexpr ExitCode kInterrupted{130};                            // as shells tell it of SIGINT

struct Options : LookOptions {
  double wait = 10;
  double timeout = kStandardLimit;
};

// The lines of the log, which people see as they come.
struct Log {
  bool shows = false;
  std::vector<std::string> lines;
  std::size_t size = 0;
  bool wasCut = false;
  void take(std::string_view line) {
    if (shows) {
      printMessage(line);
      return;
    }
    wasCut = wasCut || size + line.size() > kMaximumLogSize;
    if (wasCut) return;
    size += line.size();
    lines.emplace_back(line);
  }
};

std::string asJson(const DeviceImage& image, const host::LegacyReport& report, const Log& log) {
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
  json["log_was_cut"] = log.wasCut;
  return jsonText(json);
}

host::LegacyReport reportBefore(const DeviceImage& image) {
  host::LegacyReport report;
  report.need = host::legacyNeedOf(image);
  report.keptSettings = host::keptSettingsOf(image);
  return report;
}

std::string refusal(const DeviceImage& image, const std::string& reason) {
  host::LegacyReport report = reportBefore(image);
  report.reasons = {reason};
  return asJson(image, report, {});
}

// The lock by which programs that migrate exclude each other, those without the image's lock too.
// Held from before the settings file is copied until it is back, or a new one is there.
class MigrationLock {
 public:
  // Ends the process when the lock is not free after `seconds`.
  MigrationLock(const ImagePtr& image, const Options& options, double seconds) : _services(image) {
    platform::install(_services.services());
    const std::string text = fmt::format(
        "{}: another program migrates the settings; nothing was changed; wait until it "
        "has ended (waited {} seconds; --wait gives another time)",
        image->rootPath(), options.wait);
    const TimeLimit limit(
        std::max(seconds, kShortestWait),
        {ExitCode::heldByAnotherRun, options.json ? refusal(*image, text) : std::string(),
         messageLine(text)});
    _lock = holdMigrationLock(*image);
  }
  ~MigrationLock() { ASSAccountsManager::releaseMigrationLock(_lock); }
  MigrationLock(const MigrationLock&) = delete;
  MigrationLock& operator=(const MigrationLock&) = delete;

 private:
  deviceimage::DeviceImageServices _services;
  platform::HeldFileLockPtr _lock;
};

host::LegacyReport migrate(const ImagePtr& image, const Options& options, Log& log) {
  using Clock = std::chrono::steady_clock;
  using Seconds = std::chrono::duration<double>;
  const auto end = Clock::now() + Seconds(options.wait);
  const auto lock = takeLock(*image, options.wait);
  useTemporaryDirectory(*image);
  host::LegacyReport before = reportBefore(*image);
  if (before.need.any()) before.reasons = host::reasonsAgainstAccountMigrator(*image);
  // When it is refused, not even a lock's file is made.
  if (!before.need.any() || !before.isDone()) return before;
  const MigrationLock held(image, options, Seconds(end - Clock::now()).count());
  if (!host::adoptOrphans())
    throw CommandFailure(ExitCode::refused,
                         "the system does not let this program find what a migrator leaves "
                         "running; nothing was changed; run it outside of the sandbox that forbids "
                         "it");
  host::Interruption interruption;
  const auto limit = std::chrono::ceil<std::chrono::seconds>(Seconds(options.timeout));
  return host::runLegacyStep(*image, {kLegacyMigrationArgument, lock->descriptor(), limit},
                             interruption, [&](std::string_view line) { log.take(line); });
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

// How the command ends when its migrator was run in vain, and what is to be done then.
struct FailedEnding {
  ExitCode code = ExitCode::unexpectedFailure;
  std::string advice;
};

FailedEnding endingOf(const DeviceImage& image, const host::LegacyReport& report) {
  const bool isAsBefore = report.settings == host::SettingsFate::untouched ||
                          report.settings == host::SettingsFate::putBack;
  switch (report.migrator->ending) {
    case host::Ending::interrupted:
      return {kInterrupted, "repeat the command"};
    case host::Ending::timedOut:
      return {ExitCode::timedOut, "repeat the command with a longer --timeout"};
    case host::Ending::notLoaded:
      return {isAsBefore ? ExitCode::refused : ExitCode::unexpectedFailure,
              "put the accounts data migrator there again, and repeat the command"};
    default:
      return {ExitCode::unexpectedFailure,
              fmt::format("mend what the lines above and {} tell of, and repeat the command",
                          image.systemLogFile())};
  }
}

host::LegacyReport migrateOrSayAsJson(const ImagePtr& image, const Options& options, Log& log) {
  try {
    return migrate(image, options, log);
  } catch (const CommandFailure& failure) {
    if (options.json) fmt::print("{}", refusal(*image, failure.what()));
    throw;
  }
}

ExitCode run(const Options& options) {
  const ImagePtr image = openImage(options.image);
  Log log;
  log.shows = !options.json;
  const host::LegacyReport report = migrateOrSayAsJson(image, options, log);
  if (options.json)
    fmt::print("{}", asJson(*image, report, log));
  else if (report.isDone())
    printAsText(*image, report);
  if (report.isDone()) return ExitCode::done;
  if (!report.migrator) throw CommandFailure(ExitCode::refused, joined(report.reasons));
  const FailedEnding ending = endingOf(*image, report);
  throw CommandFailure(ending.code, fmt::format("{} The legacy files are as they were; {}",
                                                joined(report.reasons), ending.advice));
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

}  // namespace tools
