#include <fmt/format.h>

#include <memory>
#include <nlohmann/json.hpp>
#include <vector>

#include "deviceimage/RecordStores.h"
#include "tools/common/Images.h"
#include "tools/common/Program.h"
#include "tools/common/Text.h"
#include "tools/device-image/AccountServices.h"
#include "tools/device-image/AccountTypes.h"
#include "tools/device-image/Commands.h"
#include "tools/device-image/Settings.h"

namespace tools {
namespace {

using deviceimage::DeviceImage;
using deviceimage::ImageProblem;
using deviceimage::RecordStores;
using nlohmann::ordered_json;
using propertylist::Dictionary;

struct Options {
  std::string directory;
  bool json = false;
};

// What would keep the device from using an account.
void checkAccounts(const DeviceImage& image, std::vector<ImageProblem>& found) {
  const std::string file(DeviceImage::kSettingsFile);
  try {
    for (const Dictionary& account : Settings(image).accounts()) {
      const std::string type = stringOrEmpty(account, kTypeKey);
      const std::string name = stringOrEmpty(account, kIdentifierKey);
      if (!defaultClassOfType(type))
        found.push_back({file, fmt::format("the account \"{}\" has the unknown type \"{}\"; the "
                                           "device would drop it; correct its type",
                                           name, type)});
      else if (stringOrEmpty(account, kClassKey).empty())
        found.push_back({file, fmt::format("the account \"{}\" has no class; the device would drop "
                                           "it; give it one",
                                           name)});
      else if (const auto problem = mailClassProblem(account))
        found.push_back({file, fmt::format("the account \"{}\": {}", name, *problem)});
    }
  } catch (const CommandFailure&) {
    // An unreadable file is among the findings of checkFiles.
  }
}

// What programs that were stopped have left behind, and copies that were set aside.
void checkLeftovers(const DeviceImage& image, std::vector<ImageProblem>& found) {
  constexpr std::string_view kLockName = "AccountMigrationInProgress";
  for (const std::string& name : image.namesIn(DeviceImage::kTemporaryDirectory))
    if (name != kLockName)
      found.push_back({fmt::format("{}/{}", DeviceImage::kTemporaryDirectory, name),
                       "was left behind by a program that was stopped; remove it"});
  for (const std::string& name : image.namesIn(DeviceImage::kPreferencesDirectory))
    if (name.find(".unreadable-") != std::string::npos)
      found.push_back({fmt::format("{}/{}", DeviceImage::kPreferencesDirectory, name),
                       "is a settings file that could not be read and was set aside; take from it "
                       "what is needed, then remove it"});
    else if (!name.ends_with(".plist"))
      found.push_back({fmt::format("{}/{}", DeviceImage::kPreferencesDirectory, name),
                       "is no preferences file; remove it"});
}

std::vector<ImageProblem> findingsOf(const ImagePtr& image, const ServicesCheck& services) {
  std::vector<ImageProblem> found = image->checkFiles();
  found.insert(found.end(), services.missing.begin(), services.missing.end());
  checkAccounts(*image, found);
  checkLeftovers(*image, found);
  RecordStores records(image, RecordStores::Access::readOnly);
  for (const deviceimage::DatabaseReport& report : records.checkDatabases())
    for (const std::string& problem : report.problems) found.push_back({report.path, problem});
  return found;
}

ordered_json jsonOf(const std::vector<ImageProblem>& problems) {
  ordered_json json = ordered_json::array();
  for (const ImageProblem& problem : problems)
    json.push_back({{"path", problem.path}, {"text", problem.text}});
  return json;
}

ExitCode run(const Options& options) {
  const ImagePtr image = openImage(options.directory);
  const ServicesCheck services = checkServices(*image);
  const std::vector<ImageProblem> found = findingsOf(image, services);
  if (options.json) {
    ordered_json json;
    json["image"] = image->rootPath();
    json["sound"] = found.empty();
    json["findings"] = jsonOf(found);
    json["warnings"] = jsonOf(services.warnings);
    fmt::print("{}\n", json.dump(2, ' ', false, ordered_json::error_handler_t::replace));
  } else {
    for (const ImageProblem& problem : found)
      printMessage(fmt::format("{}: {}", image->absolutePath(problem.path), problem.text));
    for (const ImageProblem& warning : services.warnings)
      printMessage(fmt::format("{}: warning: {}", image->absolutePath(warning.path), warning.text));
    if (found.empty()) fmt::print("{}: sound\n", forTerminal(image->rootPath()));
  }
  return found.empty() ? ExitCode::done : ExitCode::imageDamaged;
}

}  // namespace

void addCheckCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command =
      app.add_subcommand("check", "Look whether everything in the image is as it must be");
  command->add_option("DIR", options->directory, "The image")->required();
  command->add_flag("--json", options->json, "For programs");
  command->footer(
      "Looks at the databases (integrity, references, contents), the settings, the modes of "
      "files,\n"
      "the account services, and what stopped programs left behind. Changes nothing. A service "
      "that\n"
      "is not the installed one is a warning and no finding.\n\n"
      "Example:\n  device-image check my-device");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
