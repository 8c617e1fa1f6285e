#include <memory>
#include <vector>

#include "deviceimage/SyncAgent.h"
#include "tools/device-image/AccountServices.h"
#include "tools/device-image/Commands.h"
#include "tools/device-image/import/TextLines.h"

namespace tools {
namespace {

struct Options {
  std::string directory;
  std::string syncAccountName;
  bool withoutServices = false;
};

platform::Status setSyncAccountName(const deviceimage::DeviceImage& image,
                                    const std::string& name) {
  if (name.empty()) return platform::Status::success();
  return image.writePropertyList(
      *deviceimage::DeviceImage::preferencesFile(deviceimage::SyncAgent::kApplication),
      propertylist::Dictionary{{deviceimage::SyncAgent::kAccountNameKey, name}});
}

ExitCode run(const Options& options) {
  if (!isText(options.syncAccountName))
    throw CommandFailure(ExitCode::wrongUsage, "the account name is not UTF-8 text");
  const std::vector<AccountService> services =
      options.withoutServices ? std::vector<AccountService>() : installedServices();
  const deviceimage::OpenedImage made = deviceimage::DeviceImage::create(
      options.directory, [&](const deviceimage::DeviceImage& image) {
        const platform::Status named = setSyncAccountName(image, options.syncAccountName);
        return named.isSuccess() ? placeServices(image, services) : named;
      });
  if (!made.image)
    throw CommandFailure(made.hadBegun ? ExitCode::unexpectedFailure : ExitCode::refused,
                         made.error);
  return ExitCode::done;
}

}  // namespace

void addCreateCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand("create", "Make an image without accounts");
  command->add_option("DIR", options->directory, "A new name, or an empty directory")->required();
  command->add_option("--sync-account-name", options->syncAccountName,
                      "The account name that the Quillnet sync agent knows; the stores of Quillnet "
                      "accounts are named after it");
  command->add_flag("--without-services", options->withoutServices,
                    "Leave out the bundles of the account services");
  command->footer("Example:\n  device-image create my-device --sync-account-name ada");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
