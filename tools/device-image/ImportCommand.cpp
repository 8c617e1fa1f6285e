#include <fmt/format.h>

#include <memory>
#include <utility>
#include <vector>

#include "deviceimage/RecordStores.h"
#include "tools/common/Files.h"
#include "tools/common/Images.h"
#include "tools/common/Program.h"
#include "tools/device-image/AccountStores.h"
#include "tools/device-image/Commands.h"
#include "tools/device-image/KnownRecords.h"
#include "tools/device-image/Records.h"
#include "tools/device-image/import/TextLines.h"
#include "tools/device-image/import/TextReader.h"

namespace tools {
namespace {

using deviceimage::Dataclass;
using deviceimage::NewRecord;
using deviceimage::RecordStores;

struct Options {
  std::string directory, dataclass, account, collection;
  std::vector<std::string> files;
};

// What a run has read so far.
struct Gathered {
  std::vector<NewRecord> records;
  std::size_t badCount = 0;
};

// Where the record goes in its store; empty for the store's usual place.
std::vector<std::string> collectionPath(const TextRecord& record, const FolderPath& collection) {
  if (!record.folder) return collection;
  if (record.folder->empty()) return {std::string(kTopBookmarksFolder)};
  return *record.folder;
}

void reportProblems(const std::string& file, const ReadText& text) {
  for (const Problem& problem : text.problems)
    printMessage(fmt::format("{}:{}: {}; {}", file, problem.line, problem.what, problem.remedy));
}

// Says which records of the file belong to the other dataclass of calendars.
void reportSkipped(const std::string& file, Dataclass dataclass, std::size_t skipped) {
  if (skipped == 0) return;
  const bool areEvents = dataclass == Dataclass::reminders;
  printMessage(fmt::format("{}: {} {} left out; import them with --dataclass {}", file, skipped,
                           areEvents ? "events" : "to-dos", areEvents ? "calendars" : "reminders"));
}

void gather(const Options& options, Dataclass dataclass, const std::string& file,
            Progress& progress, Gathered& gathered) {
  FolderPath collection;
  if (!options.collection.empty()) collection.push_back(options.collection);
  ReadText text = readText(dataclass, readWholeFile(file, kMaximumFileSize), collection);
  progress.wipe();
  reportProblems(file, text);
  gathered.badCount += text.problems.size();
  std::size_t skipped = 0;
  for (TextRecord& record : text.records) {
    if (record.dataclass != dataclass) {
      ++skipped;
      continue;
    }
    gathered.records.push_back({collectionPath(record, collection), std::move(record.uid),
                                std::move(record.bytes), record.modified.value_or(0)});
  }
  reportSkipped(file, dataclass, skipped);
}

// Puts the records into the store, apart from those that it holds already.
deviceimage::Placed add(const ImagePtr& image, Dataclass dataclass, const ChosenStore& store,
                        std::vector<NewRecord> records) {
  RecordStores stores(image, RecordStores::Access::readWrite);
  KnownRecords known(stores, dataclass, store.storeIdentifier);
  const auto alreadyThere =
      std::erase_if(records, [&known](const NewRecord& record) { return known.hold(record); });
  if (records.empty()) return {0, static_cast<std::int64_t>(alreadyThere), 0};
  RecordStores::Added added = stores.addRecords(dataclass, store.storeIdentifier, records);
  requireSuccess(added.status, "nothing was imported");
  added.placed.alreadyThere += static_cast<std::int64_t>(alreadyThere);
  return added.placed;
}

ExitCode run(const Options& options) {
  const Dataclass dataclass = recordDataclassNamed(options.dataclass);
  if (!isText(options.collection) || options.collection.size() > kMaximumFolderName)
    throw CommandFailure(ExitCode::wrongUsage,
                         "the collection's name is not UTF-8 text of at most 1000 bytes");
  const LockedImage locked = openImageForWriting(options.directory);
  const ChosenStore store = chooseStore(*locked.image, dataclass, options.account);
  Gathered gathered;
  Progress progress;
  for (std::size_t i = 0; i < options.files.size(); ++i) {
    progress.show(fmt::format("reading file {} of {}", i + 1, options.files.size()));
    gather(options, dataclass, options.files[i], progress, gathered);
  }
  deviceimage::Placed placed;
  if (!gathered.records.empty()) {
    progress.show(fmt::format("writing {} records", gathered.records.size()));
    placed = add(locked.image, dataclass, store, std::move(gathered.records));
  }
  progress.wipe();
  fmt::print("{}: {} added, {} already there, {} conflicting copies, {} bad; {}\n",
             deviceimage::dataclassName(dataclass), placed.added, placed.alreadyThere,
             placed.conflicts, gathered.badCount, store.description);
  return gathered.badCount == 0 ? ExitCode::done : ExitCode::someRecordsBad;
}

}  // namespace

void addImportCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand("import", "Put the records of files into a store");
  command->add_option("DIR", options->directory, "The image")->required();
  command
      ->add_option("FILE", options->files,
                   "vCard (contacts), iCalendar (calendars, reminders), bookmarks HTML or text "
                   "notes")
      ->required();
  command
      ->add_option("--dataclass", options->dataclass,
                   "contacts, calendars, reminders, bookmarks or notes")
      ->required();
  command->add_option("--account", options->account,
                      "The identifier of the account whose store takes them; otherwise the local "
                      "store does");
  command->add_option("--collection", options->collection,
                      "The address book, calendar, list or folder in the store");
  command->footer(
      "A bad record is named with its file and line, the others are imported (exit code 4).\n\n"
      "Examples:\n"
      "  device-image import my-device --dataclass contacts family.vcf friends.vcf\n"
      "  device-image import my-device --dataclass calendars --account Q1 work.ics");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
