// An accounts data migrator that behaves as the file tmp/behaviour of its image says:
//   answers false     fails, as one does that cannot write
//   answers true      says that it went well, and writes nothing
//   crashes, raises   as it says
//   stays             says so in the log and stays until it is ended
//   writes version 7  writes a settings file of that version
//   writes, answers false    writes a settings file and fails all the same
//   writes, says LINE        writes a settings file; the line is in the log
//   writes, logs 65 MiB      writes a settings file, and lines of a MiB each
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <memory>
#include <stdexcept>
#include <string>

#include "QuillnetAccountTypeRemoval/AccountsDataMigrator.h"
#include "QuillnetAccountTypeRemoval/SettingsFileWriting.h"
#include "platform/Services.h"

namespace {

std::string behaviour() {
  std::ifstream file(platform::services().deviceInfo.systemRootDirectory() + "/tmp/behaviour");
  std::string line;
  std::getline(file, line);
  return line;
}

void write(int version) {
  const std::string file = platform::services().userDatabase.homeDirectory() +
                           "/Library/Preferences/com.vantor.accountsettings.plist";
  accountsettings::writeSettingsFile({{"Version", version}, {"Accounts", propertylist::Array()}},
                                     file, false);
}

class ScriptedMigrator : public accountsettings::AccountsDataMigrator {
 public:
  bool executeMigrationSteps() override {
    const std::string what = behaviour();
    platform::logToSystem("ScriptedMigrator: %@", what);
    if (what == "crashes") std::abort();
    if (what == "raises") throw std::runtime_error("not today");
    while (what == "stays") ::pause();
    if (what == "writes version 7") write(7);
    if (what.starts_with("writes, ")) write(12);
    if (what == "writes, logs 65 MiB")
      for (int count = 0; count < 65; ++count)
        platform::services().systemLog.writeLine(std::string(std::size_t{1} << 20U, 'x'));
    return !what.ends_with("answers false");
  }
};

class ScriptedMigratorClass : public platform::RuntimeClass,
                              public accountsettings::AccountsDataMigratorClass {
 public:
  ScriptedMigratorClass() { platform::registerClass(*this); }
  std::string className() const override { return "AccountsDataMigrator"; }
  std::unique_ptr<accountsettings::AccountsDataMigrator> init() override {
    return std::make_unique<ScriptedMigrator>();
  }
};
auto& migratorClass = *new ScriptedMigratorClass;

}  // namespace
