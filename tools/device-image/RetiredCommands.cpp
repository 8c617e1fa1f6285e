// The commands that end the waiting of retired stores: restore and purge.
#include <fmt/format.h>

#include <memory>
#include <optional>

#include "deviceimage/RecordStores.h"
#include "tools/common/Images.h"
#include "tools/device-image/AccountStores.h"
#include "tools/device-image/Commands.h"
#include "tools/device-image/Records.h"
#include "tools/device-image/RetiredStores.h"

namespace tools {
namespace {

using deviceimage::Dataclass;
using deviceimage::RecordStores;
using deviceimage::Store;

struct Options {
  std::string directory, dataclass, account;
  std::optional<deviceimage::Row> store;
};

ExitCode runRestore(const Options& options) {
  const Dataclass dataclass = recordDataclassNamed(options.dataclass);
  const LockedImage locked = openImageForWriting(options.directory);
  const ChosenStore target = chooseStore(*locked.image, dataclass, options.account);
  RecordStores records(locked.image, RecordStores::Access::readWrite);
  deviceimage::Placed sum;
  for (const Store& store : retiredStores(records, dataclass, options.store)) {
    const RecordStores::Added added =
        records.bringBackRetiredStore(dataclass, store.row, target.storeIdentifier);
    requireSuccess(added.status, fmt::format("store {} was not brought back", store.row));
    sum.added += added.placed.added;
    sum.alreadyThere += added.placed.alreadyThere;
    sum.conflicts += added.placed.conflicts;
  }
  fmt::print("{}: {} brought back, {} already there, {} conflicting copies; {}\n",
             deviceimage::dataclassName(dataclass), sum.added, sum.alreadyThere, sum.conflicts,
             target.description);
  return ExitCode::done;
}

ExitCode runPurge(const Options& options) {
  const Dataclass dataclass = recordDataclassNamed(options.dataclass);
  const LockedImage locked = openImageForWriting(options.directory);
  RecordStores records(locked.image, RecordStores::Access::readWrite);
  std::int64_t count = 0;
  for (const Store& store : retiredStores(records, dataclass, options.store)) {
    const RecordStores::Purged purged = records.purgeRetiredStore(dataclass, store.row);
    requireSuccess(purged.status, fmt::format("store {} was not purged", store.row));
    count += purged.records;
  }
  fmt::print("{}: {} records destroyed\n", deviceimage::dataclassName(dataclass), count);
  return ExitCode::done;
}

// The options that both commands have.
CLI::App* addCommand(CLI::App& app, const char* name, const char* description, Options& options) {
  CLI::App* const command = app.add_subcommand(name, description);
  command->add_option("DIR", options.directory, "The image")->required();
  command
      ->add_option("--dataclass", options.dataclass,
                   "contacts, calendars, reminders, bookmarks or notes")
      ->required();
  command->add_option("--store", options.store,
                      "Only the retired store with this number, as show lists it");
  return command;
}

}  // namespace

void addRestoreCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command =
      addCommand(app, "restore", "Copy the records of retired stores back into a store", *options);
  command->add_option("--account", options->account,
                      "The identifier of the account whose store takes them; otherwise the local "
                      "store does");
  command->footer(
      "What is there already is not doubled; the retired stores stay until they are purged.\n\n"
      "Example:\n  device-image restore my-device --dataclass contacts");
  command->callback([options, &outcome] { outcome = runRestore(*options); });
}

void addPurgeCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command =
      addCommand(app, "purge", "Destroy the records of retired stores for good", *options);
  command->footer(
      "Events and reminders of one account are retired in one store and go together.\n\n"
      "Example:\n  device-image purge my-device --dataclass contacts --store 3");
  command->callback([options, &outcome] { outcome = runPurge(*options); });
}

}  // namespace tools
