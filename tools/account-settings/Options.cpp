#include "tools/account-settings/Options.h"

#include <cmath>
#include <cstdlib>

namespace tools {

void addLookOptions(CLI::App& command, LookOptions& options) {
  command.add_option("--image", options.image, "The device image")->required()->type_name("DIR");
  command.add_flag("--json", options.json, "For programs");
}

void addIdentifier(CLI::App& command, const std::string& name, std::string& identifier,
                   const std::string& help) {
  command.add_option(name, identifier, help)->required()->check([](const std::string& text) {
    return text.empty() ? std::string("an identifier is not empty") : std::string();
  });
}

CLI::Option* addSeconds(CLI::App& command, const std::string& name, double& seconds,
                        double shortest, const std::string& help) {
  constexpr double kLongest = 86'400;
  return command.add_option(name, seconds, help)
      ->type_name("SECONDS")
      ->check(CLI::Range(shortest, kLongest))
      ->check([](const std::string& text) {  // which lets "nan" pass
        return std::isfinite(std::strtod(text.c_str(), nullptr)) ? std::string()
                                                                 : text + " is no number";
      });
}

void addWait(CLI::App& command, double& wait) {
  addSeconds(command, "--wait", wait, 0, "How long to wait for a lock that another run holds (10)");
}

void addChangeOptions(CLI::App& command, ChangeOptions& options) {
  addLookOptions(command, options);
  command.add_flag("--lock,!--no-lock", options.lock,
                   "Hold the image's lock from reading to writing, so that nobody's change is "
                   "lost (the default)");
  addWait(command, options.wait);
  command.add_flag("--notify", options.notify,
                   "Tell the notifiers of the image's account services; runs their code");
  command.add_flag("--dry-run", options.dryRun, "Print what would change, and change nothing");
}

}  // namespace tools
