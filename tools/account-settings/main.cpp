// account-settings: looks at and changes the account settings file of a device image.
#include <algorithm>
#include <cstddef>
#include <string_view>

#include "tools/account-settings/Commands.h"
#include "tools/common/Program.h"

namespace {

constexpr const char* kFooter =
    "--image DIR may stand before the command too.\n\n"
    "Exit codes: 0 done; 1 unexpected failure; 2 wrong usage; 6 a settings file is damaged, or\n"
    "validate found something; 7 refused, nothing was written; 9 the time was up; 10 the "
    "data-access\n"
    "daemon runs all the same; 11 another run holds the image; 130 interrupted.\n\n"
    "Example:\n"
    "  account-settings list --image my-device\n"
    "  account-settings show Q1 --image my-device\n"
    "  account-settings set Q1 DisplayName \"Ada at home\" --image my-device";

// Puts a "--image DIR" that stands before the command behind it, where the command looks for it.
void moveImageBehindCommand(int argumentCount, char** arguments) {
  if (argumentCount < 3) return;
  const std::string_view first = arguments[1];
  const std::ptrdiff_t words = first == "--image" ? 2 : first.starts_with("--image=") ? 1 : 0;
  if (words == 0 || argumentCount <= words + 1) return;
  std::rotate(arguments + 1, arguments + 1 + words, arguments + 2 + words);
}

}  // namespace

int main(int argumentCount, char** arguments) {
  if (tools::isLegacyMigrationProcess(argumentCount, arguments))
    return tools::migrateLegacyInThisProcess(arguments);
  moveImageBehindCommand(argumentCount, arguments);
  CLI::App app("Looks at and changes the account settings file of a device image.",
               "account-settings");
  app.set_version_flag("--version", "account-settings " PROJECT_VERSION);
  app.footer(kFooter);
  app.require_subcommand(1);
  tools::ExitCode outcome = tools::ExitCode::done;
  tools::addListCommand(app, outcome);
  tools::addShowCommand(app, outcome);
  tools::addEnableCommand(app, outcome);
  tools::addDisableCommand(app, outcome);
  tools::addSetCommand(app, outcome);
  tools::addUnsetCommand(app, outcome);
  tools::addInsertCommand(app, outcome);
  tools::addDeleteCommand(app, outcome);
  tools::addAddChildCommand(app, outcome);
  tools::addRemoveChildCommand(app, outcome);
  tools::addValidateCommand(app, outcome);
  tools::addConvertCommand(app, outcome);
  tools::addExplainMergeCommand(app, outcome);
  tools::addMigrateLegacyCommand(app, outcome);
  tools::addWaitForMigrationCommand(app, outcome);
  tools::addStopDaemonCommand(app, outcome);
  return tools::runProgram(app, outcome, argumentCount, arguments);
}
