// device-image: makes device images, fills them with records, and looks at them.
#include <fmt/format.h>

#include <csignal>
#include <cstdio>
#include <exception>

#include "tools/device-image/Commands.h"
#include "tools/device-image/Images.h"

namespace {

using deviceimagetool::CommandFailure;
using deviceimagetool::ExitCode;

constexpr const char* kFooter =
    "Exit codes: 0 done; 1 unexpected failure; 2 wrong usage; 4 some records were bad, the others\n"
    "were imported; 6 the image is damaged, or check found something; 7 refused, nothing was\n"
    "written; 11 another run holds the image.\n\n"
    "Example:\n"
    "  device-image create my-device --sync-account-name ada\n"
    "  device-image add-account my-device --type Quillnet --identifier Q1 --status 1 "
    "--enable contacts\n"
    "  device-image import my-device --dataclass contacts --account Q1 contacts.vcf\n"
    "  device-image show my-device";

ExitCode runCommandLine(int argumentCount, char** arguments) {
  CLI::App app("Makes device images, fills them with records, and looks at them.", "device-image");
  app.set_version_flag("--version", "device-image " PROJECT_VERSION);
  app.footer(kFooter);
  app.require_subcommand(1);
  ExitCode outcome = ExitCode::done;
  deviceimagetool::addCreateCommand(app, outcome);
  deviceimagetool::addAddAccountCommand(app, outcome);
  deviceimagetool::addImportCommand(app, outcome);
  deviceimagetool::addExportCommand(app, outcome);
  deviceimagetool::addShowCommand(app, outcome);
  deviceimagetool::addCheckCommand(app, outcome);
  deviceimagetool::addRestoreCommand(app, outcome);
  deviceimagetool::addPurgeCommand(app, outcome);
  try {
    app.parse(argumentCount, arguments);
  } catch (const CLI::ParseError& stop) {
    // --help and --version stop the parsing too, with code 0.
    return app.exit(stop) == 0 ? ExitCode::done : ExitCode::wrongUsage;
  }
  return outcome;
}

ExitCode run(int argumentCount, char** arguments) {
  try {
    return runCommandLine(argumentCount, arguments);
  } catch (const CommandFailure& failure) {
    deviceimagetool::printMessage(failure.what());
    return failure.code();
  } catch (const std::exception& failure) {
    deviceimagetool::printMessage(fmt::format("unexpected failure: {}", failure.what()));
    return ExitCode::unexpectedFailure;
  }
}

}  // namespace

int main(int argumentCount, char** arguments) {
  std::signal(SIGPIPE, SIG_IGN);  // a closed pipe is a failed write like any other
  ExitCode outcome = run(argumentCount, arguments);
  if (std::fflush(stdout) != 0 && outcome == ExitCode::done) {
    deviceimagetool::printMessage("cannot write standard output; what was printed is incomplete");
    outcome = ExitCode::unexpectedFailure;
  }
  return static_cast<int>(outcome);
}
