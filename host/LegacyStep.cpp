#include "host/LegacyStep.h"

#include <utility>

#include "host/Settings.h"
#include "host/SettingsFileCheck.h"

namespace host {
namespace {

using deviceimage::DeviceImage;

std::string sentenceFor(const LegacyReport& report, const DeviceImage& image) {
  const std::string path = image.settingsFile();
  switch (report.settings) {
    case SettingsFate::untouched:
      return path + (report.settingsBefore.exists ? " is as it was." : " is missing, as it was.");
    case SettingsFate::replaced:
      return path + " is a new one" +
             (report.keptCopy.empty()
                  ? "."
                  : "; what was there before is kept beside it as " + report.keptCopy + ".");
    case SettingsFate::putBack:
      if (!report.settingsBefore.exists)
        return path + " was missing; the newest copy was put back.";
      return path + " was put back with what it held.";
    case SettingsFate::lost:
      return path +
             " is gone and could not be put back; bring back the copy that is kept beside "
             "it.";
  }
  return {};
}

// What speaks against a migration that says that it went well.
std::vector<std::string> doubtsAbout(const DeviceImage& image, SettingsFate fate,
                                     const Settings& before) {
  if (fate == SettingsFate::replaced) return checkSettingsFile(image, before, readSettings(image));
  if (fate == SettingsFate::untouched && !legacyNeedOf(image).any()) return {};
  return {std::string(kAccountMigratorName) + " made no settings file of what older systems left."};
}

void judge(const DeviceImage& image, LegacyReport& report) {
  std::string sentence = sentenceFor(*report.migrator);
  if (sentence.empty())
    report.reasons = doubtsAbout(image, report.settings, report.settingsBefore);
  else
    report.reasons.push_back(std::move(sentence));
  if (!report.isDone()) report.reasons.push_back(sentenceFor(report, image));
}

}  // namespace

std::string_view resultOf(const LegacyReport& report) {
  if (!report.isDone()) return report.migrator ? "failed" : "refused";
  return report.migrator ? "done" : "not needed";
}

std::string_view nameOf(SettingsFate fate) {
  switch (fate) {
    case SettingsFate::untouched:
      return "untouched";
    case SettingsFate::replaced:
      return "replaced";
    case SettingsFate::putBack:
      return "put back";
    case SettingsFate::lost:
      return "lost";
  }
  return "lost";
}

std::string describe(const LegacyReport& report) {
  if (!report.isDone() || !report.migrator) return std::string(resultOf(report));
  if (report.migrator->ending == Ending::notNeeded || report.settings == SettingsFate::untouched)
    return "migrated by another program meanwhile";
  if (report.need.olderVersion) return "brought to version " + std::to_string(kPresentVersion);
  std::string text = "built from the legacy ";
  if (report.need.mailAccounts) text += "mail accounts";
  if (report.need.mailAccounts && report.need.dataAccess) text += " and ";
  if (report.need.dataAccess) text += "data-access preferences";
  return text;
}

LegacyReport runLegacyStep(const DeviceImage& image, const LegacyTask& task,
                           Interruption& interruption, const LineSink& sink) {
  LegacyReport report;
  report.need = legacyNeedOf(image);
  if (report.need.any()) report.reasons = reasonsAgainstAccountMigrator(image);
  if (report.need.any() && report.isDone()) {
    report.settingsBefore = readSettings(image);
    KeptSettings kept(image, !task.childKeepsSettings);
    if (kept.error().empty()) {
      report.migrator = runMigrator({std::string(kAccountMigratorName),
                                     {task.childArgument, image.rootPath()},
                                     image.temporaryDirectory(),
                                     task.lockDescriptor,
                                     task.limit},
                                    interruption, sink);
      report.settings = kept.settle();
      report.keptCopy = kept.copy();
      judge(image, report);
    } else {
      report.reasons.push_back(image.settingsFile() +
                               " cannot be copied, so that nothing was done: " + kept.error() +
                               ".");
    }
  }
  report.keptSettings = keptSettingsOf(image);
  return report;
}

}  // namespace host
