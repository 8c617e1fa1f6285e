#include <fmt/format.h>

#include <memory>
#include <optional>

#include "deviceimage/DeviceImageServices.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/ImageAccess.h"
#include "tools/account-settings/Options.h"
#include "tools/account-settings/Shown.h"
#include "tools/account-settings/TimeLimit.h"
#include "tools/common/Images.h"
#include "tools/common/Program.h"

namespace tools {
namespace {

struct Options : LookOptions {
  double timeout = 0;  // none
};

std::string answer(const deviceimage::DeviceImage& image, const char* outcome) {
  return jsonText({{"image", image.rootPath()}, {"outcome", outcome}});
}

TimeLimit::Ending endingWhenTimeIsUp(const deviceimage::DeviceImage& image,
                                     const Options& options) {
  return {ExitCode::timedOut, options.json ? answer(image, "timed out") : std::string(),
          messageLine(fmt::format("{}: a migration still runs after {} seconds; wait on, or see "
                                  "which program holds {}/AccountMigrationInProgress",
                                  image.rootPath(), options.timeout, image.temporaryDirectory()))};
}

ExitCode run(const Options& options) {
  const ImagePtr image = openImage(options.image);
  const deviceimage::DeviceImageServices services(image);
  platform::install(services.services());
  std::optional<TimeLimit> limit;
  if (options.timeout > 0) limit.emplace(options.timeout, endingWhenTimeIsUp(*image, options));
  waitForOtherMigrations(*image);
  limit.reset();
  fmt::print("{}", options.json ? answer(*image, "free") : "no migration runs\n");
  return ExitCode::done;
}

}  // namespace

void addWaitForMigrationCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand(
      "wait-for-migration", "Wait until no program migrates the image's settings");
  addLookOptions(*command, *options);
  addSeconds(*command, "--timeout", options->timeout, 0.1,
             "Give up after this time, with exit code 9; without it, wait for ever");
  command->footer(
      "Holds nothing afterwards. The file tmp/AccountMigrationInProgress is made when it is "
      "missing.\n\n"
      "Example:\n  account-settings wait-for-migration --image my-device --timeout 60");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
