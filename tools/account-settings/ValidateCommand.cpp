#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <memory>
#include <nlohmann/json.hpp>

#include "tools/account-settings/AccountStore.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/Oddities.h"
#include "tools/account-settings/Options.h"
#include "tools/account-settings/Shown.h"
#include "tools/common/Program.h"

namespace tools {
namespace {

using deviceimage::DeviceImage;

Oddity oddityOfFile(std::string text, Oddity::Effect effect = Oddity::Effect::none) {
  return {{}, {}, {}, std::move(text), effect};
}

void lookAtMode(const DeviceImage& image, std::vector<Oddity>& found) {
  const deviceimage::OpenedFile file = image.openFile(DeviceImage::kSettingsFile, O_RDONLY);
  if (file.descriptor < 0) return;
  struct stat status {};
  ::fstat(file.descriptor, &status);
  ::close(file.descriptor);
  const unsigned mode = status.st_mode & 07777U;
  if (mode != 0600)
    found.push_back(oddityOfFile(fmt::format(
        "its mode is {:04o}, not 0600; others may read people's accounts; use chmod", mode)));
}

std::vector<Oddity> findingsOf(const ImagePtr& image) {
  const auto services = installServices(image, std::make_shared<std::vector<std::string>>(), false);
  std::vector<Oddity> found;
  lookAtMode(*image, found);
  const auto read = image->readPropertyList(DeviceImage::kSettingsFile);
  if (!read.exists) {
    found.push_back(oddityOfFile("it does not exist; the library sees no account"));
  } else if (!read.value || read.value->asDictionary() == nullptr) {
    const std::string why = read.value ? "it holds no dictionary" : read.error;
    found.push_back(oddityOfFile("it cannot be read: " + why, Oddity::Effect::lost));
  } else {
    for (Oddity& oddity : findOddities(*read.value->asDictionary()))
      found.push_back(std::move(oddity));
  }
  return found;
}

const char* nameOf(Oddity::Effect effect) {
  return effect == Oddity::Effect::lost         ? "lost at the next save"
         : effect == Oddity::Effect::passedOver ? "passed over"
                                                : "none";
}

void showAsJson(const DeviceImage& image, const std::vector<Oddity>& found) {
  nlohmann::json json;
  json["image"] = image.rootPath();
  json["file"] = image.settingsFile();
  json["sound"] = found.empty();
  json["findings"] = nlohmann::json::array();
  for (const Oddity& oddity : found) {
    nlohmann::json finding;
    finding["place"] = orNull(oddity.place);
    finding["identifier"] = orNull(oddity.identifier);
    finding["key"] = orNull(oddity.key);
    finding["text"] = oddity.text;
    finding["effect"] = nameOf(oddity.effect);
    json["findings"].push_back(std::move(finding));
  }
  printJson(json);
}

ExitCode run(const LookOptions& options) {
  const ImagePtr image = openImage(options.image);
  const std::vector<Oddity> found = findingsOf(image);
  if (options.json) {
    showAsJson(*image, found);
  } else {
    for (const Oddity& oddity : found)
      printMessage(fmt::format("{}: {}", image->settingsFile(), describe(oddity)));
    if (found.empty()) fmt::print("{}: sound\n", image->settingsFile());
  }
  return found.empty() ? ExitCode::done : ExitCode::imageDamaged;
}

}  // namespace

void addValidateCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<LookOptions>();
  CLI::App* const command =
      app.add_subcommand("validate", "Report everything odd in the settings file");
  addLookOptions(*command, *options);
  command->footer(
      "Changes nothing. Exit code 0 when nothing was found, else 6.\n\n"
      "Example:\n  account-settings validate --image my-device");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
