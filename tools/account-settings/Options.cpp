#include "tools/account-settings/Options.h"

namespace tools {

void addLookOptions(CLI::App& command, LookOptions& options) {
  command.add_option("--image", options.image, "The device image")->required()->type_name("DIR");
  command.add_flag("--json", options.json, "For programs");
}

void addChangeOptions(CLI::App& command, ChangeOptions& options) {
  addLookOptions(command, options);
  command.add_flag("--lock,!--no-lock", options.lock,
                   "Hold the image's lock from reading to writing, so that nobody's change is "
                   "lost (the default)");
  command
      .add_option("--wait", options.wait, "How long to wait for a lock that another run holds (10)")
      ->type_name("SECONDS")
      ->check(CLI::Range(0.0, 86'400.0));
  command.add_flag("--notify", options.notify,
                   "Tell the notifiers of the image's account services; runs their code");
  command.add_flag("--dry-run", options.dryRun, "Print what would change, and change nothing");
}

}  // namespace tools
