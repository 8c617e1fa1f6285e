#include <fmt/format.h>

#include <memory>
#include <optional>
#include <vector>

#include "deviceimage/RecordStores.h"
#include "tools/common/Files.h"
#include "tools/common/Images.h"
#include "tools/device-image/AccountStores.h"
#include "tools/device-image/Commands.h"
#include "tools/device-image/Records.h"
#include "tools/device-image/RetiredStores.h"
#include "tools/device-image/export/RecordWriter.h"

namespace tools {
namespace {

using deviceimage::Dataclass;
using deviceimage::RecordStores;
using deviceimage::Store;

struct Options {
  std::string directory, dataclass, account, output;
  bool retired = false;
  std::optional<deviceimage::Row> store;
};

std::vector<Store> storesOf(const Options& options, const deviceimage::DeviceImage& image,
                            RecordStores& records, Dataclass dataclass) {
  if (options.retired) return retiredStores(records, dataclass, options.store);
  const ChosenStore chosen = chooseStore(image, dataclass, options.account);
  const RecordStores::Found found = records.findStore(dataclass, chosen.storeIdentifier);
  requireSuccess(found.status, "nothing was exported");
  if (!found.store) return {};
  return {*found.store};
}

ExitCode run(const Options& options) {
  const Dataclass dataclass = recordDataclassNamed(options.dataclass);
  const ImagePtr image = openImage(options.directory);
  RecordStores records(image, RecordStores::Access::readOnly);
  const std::vector<Store> stores = storesOf(options, *image, records, dataclass);
  Output output(options.output);
  writeRecords(records, dataclass, stores, output);
  output.finish();
  return ExitCode::done;
}

}  // namespace

void addExportCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand("export", "Write the records of a store");
  command->add_option("DIR", options->directory, "The image")->required();
  command
      ->add_option("--dataclass", options->dataclass,
                   "contacts, calendars, reminders, bookmarks or notes")
      ->required();
  CLI::Option* const account =
      command->add_option("--account", options->account,
                          "The identifier of the account whose store it is; otherwise the local "
                          "store");
  CLI::Option* const retired =
      command->add_flag("--retired", options->retired, "The records of all retired stores instead")
          ->excludes(account);
  command->add_option("--store", options->store, "Only the retired store with this number")
      ->needs(retired);
  command->add_option("--output", options->output, "The file; otherwise standard output");
  command->footer(
      "Examples:\n"
      "  device-image export my-device --dataclass contacts --output contacts.vcf\n"
      "  device-image export my-device --dataclass calendars --retired > retired.ics");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
