#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "host/Interruption.h"
#include "host/KeptSettings.h"
#include "host/LegacySettings.h"
#include "host/MigratorProcess.h"
#include "host/Settings.h"

namespace host {

// What a legacy step has done.
struct LegacyReport {
  LegacyNeed need;                          // before the step
  std::optional<MigratorOutcome> migrator;  // none when it was not run
  SettingsFate settings = SettingsFate::untouched;
  Settings settingsBefore;  // before the step; of a step that ran a migrator
  std::string keptCopy;     // the path of the copy of those settings; empty when there is none
  std::vector<std::string> keptSettings;  // paths of all copies that lie in the image afterwards
  std::vector<std::string> reasons;       // sentences: why it was refused, or what went wrong
  // Whether nothing is left to be done.
  bool isDone() const { return reasons.empty(); }
  // Whether the migrator of this step has made the settings file.
  bool hasMadeSettings() const { return migrator && migrator->ending == Ending::succeeded; }
};

// The words for programs: "not needed", "done", "failed" or "refused"; and "untouched", "replaced",
// "put back" or "lost".
std::string_view resultOf(const LegacyReport& report);
std::string_view nameOf(SettingsFate fate);
// What was done, for people: "built from the legacy mail accounts".
std::string describe(const LegacyReport& report);

struct LegacyTask {
  // The child argument of this program whose process decides again under the migration lock, and
  // migrates. It gets the image's path besides.
  std::string childArgument;
  int lockDescriptor = -1;  // the image's lock, which is held
  std::chrono::seconds limit{0};
  // Whether that process copies the settings file itself, with keepSettings, once it has the
  // migration lock. Else the file is copied before the process is started.
  bool childKeepsSettings = false;
};

// Has the image's accounts data migrator make a settings file of what older systems left, when
// there is something to migrate: in a process of its own, as runMigrator says. Refuses before
// anything is changed when that migrator is missing or not to be trusted. The settings file is
// copied first; one that is gone after a failure is put back, from the newest copy. The legacy
// files are not touched.
LegacyReport runLegacyStep(const deviceimage::DeviceImage& image, const LegacyTask& task,
                           Interruption& interruption, const LineSink& sink);

// The child argument of the migration host itself.
inline constexpr const char* kMigrateLegacyArgument = "--migrate-legacy-settings-in-this-process";
// Whether the program was started with that child argument.
bool isLegacyProcess(int argumentCount, char** arguments);
// What that process does; gives its exit status.
int migrateLegacyInThisProcess(char** arguments);

}  // namespace host
