// device-image: makes device images, fills them with records, and looks at them.
#include "tools/common/Program.h"
#include "tools/device-image/Commands.h"

namespace {

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

}  // namespace

int main(int argumentCount, char** arguments) {
  CLI::App app("Makes device images, fills them with records, and looks at them.", "device-image");
  app.set_version_flag("--version", "device-image " PROJECT_VERSION);
  app.footer(kFooter);
  app.require_subcommand(1);
  tools::ExitCode outcome = tools::ExitCode::done;
  tools::addCreateCommand(app, outcome);
  tools::addAddAccountCommand(app, outcome);
  tools::addImportCommand(app, outcome);
  tools::addExportCommand(app, outcome);
  tools::addShowCommand(app, outcome);
  tools::addCheckCommand(app, outcome);
  tools::addRestoreCommand(app, outcome);
  tools::addPurgeCommand(app, outcome);
  return tools::runProgram(app, outcome, argumentCount, arguments);
}
