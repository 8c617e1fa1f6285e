#include <fmt/format.h>

#include <memory>
#include <nlohmann/json.hpp>

#include "tools/account-settings/Commands.h"
#include "tools/account-settings/LibraryMerge.h"
#include "tools/account-settings/Oddities.h"
#include "tools/account-settings/PropertyListInput.h"
#include "tools/account-settings/Shown.h"
#include "tools/common/Table.h"

namespace tools {
namespace {

using propertylist::Dictionary;

struct Options {
  std::string inMemory;
  std::string original;
  std::string onDisk;
  bool json = false;
};

// An unknown key beside the accounts is left out of every save, and no matter of the merge.
bool hindersMerge(const Oddity& oddity) {
  return oddity.effect == Oddity::Effect::lost &&
         (!oddity.place.empty() || oddity.key == "Accounts");
}

// The library makes a new identifier up at each reading for an account that has none, so that the
// versions of it are no longer known as one account.
void requireIdentifiers(const std::string& file, const Dictionary& settings) {
  const propertylist::Array* const accounts = propertylist::findArray(settings, "Accounts");
  for (std::size_t i = 0; accounts != nullptr && i < accounts->size(); ++i) {
    const Dictionary& account = *(*accounts)[i].asDictionary();
    const propertylist::Text* const type =
        propertylist::findString(account, accountsettings::kAccountType);
    if (*type == accountsettings::kOnMyDeviceAccountType ||
        propertylist::findString(account, accountsettings::kAccountIdentifier) != nullptr)
      continue;
    throw CommandFailure(
        ExitCode::imageDamaged,
        fmt::format("{}: Accounts[{}]: Identifier: is missing or no string, so that nothing tells "
                    "which account this is in the other files; write one into all three",
                    file, i));
  }
}

// A settings file that the library can read as a whole.
Dictionary settingsIn(const std::string& file) {
  const propertylist::Value value = readPropertyListOfAnyForm(file);
  if (value.asDictionary() == nullptr)
    throw CommandFailure(ExitCode::imageDamaged,
                         fmt::format("{}: it is no settings file, which is a dictionary with "
                                     "\"Accounts\"; give the whole file",
                                     file));
  for (const Oddity& oddity : findOddities(*value.asDictionary()))
    if (hindersMerge(oddity))
      throw CommandFailure(ExitCode::imageDamaged,
                           fmt::format("{}: {}; correct the file", file, describe(oddity)));
  requireIdentifiers(file, *value.asDictionary());
  return *value.asDictionary();
}

void showAsJson(const std::vector<MergeLine>& lines) {
  nlohmann::json json;
  json["lines"] = nlohmann::json::array();
  for (const MergeLine& line : lines) {
    nlohmann::json entry;
    entry["account"] = line.account;
    entry["key"] = orNull(line.key);
    entry["winner"] = nameOf(line.winner);
    entry["why"] = line.why;
    entry["value"] = line.value ? jsonFormOf(*line.value) : nlohmann::json();
    json["lines"].push_back(std::move(entry));
  }
  printJson(json);
}

void printTable(const std::vector<MergeLine>& lines) {
  Table table({"ACCOUNT", "KEY", "WINNER", "WHY", "RESULT"});
  for (const MergeLine& line : lines) {
    const bool isWhole = line.key.empty();
    const std::string result = !line.value ? "-" : isWhole ? "" : shownValue(*line.value);
    table.addRow({isWhole ? line.account : "", line.key,
                  line.why == "merged key by key" ? "" : std::string(nameOf(line.winner)), line.why,
                  result});
  }
  fmt::print("{}", table.text());
}

ExitCode run(const Options& options) {
  LibraryMerge library;
  const Dictionary inMemory = settingsIn(options.inMemory);
  const Dictionary original = settingsIn(options.original);
  const Dictionary onDisk = settingsIn(options.onDisk);
  const AccountVersions originalAccounts = LibraryMerge::originalsOf(original);
  const std::vector<MergeLine> lines = explainMerge(
      LibraryMerge::accountsOf(inMemory), originalAccounts, LibraryMerge::accountsOf(onDisk),
      library.merge(inMemory, originalAccounts, onDisk));
  if (options.json)
    showAsJson(lines);
  else
    printTable(lines);
  return ExitCode::done;
}

}  // namespace

void addExplainMergeCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand(
      "explain-merge", "Tell for each account and key which side a save follows, and why");
  command
      ->add_option("--in-memory", options->inMemory, "The settings as a program has changed them")
      ->required()
      ->type_name("FILE");
  command->add_option("--original", options->original, "The settings as that program had read them")
      ->required()
      ->type_name("FILE");
  command->add_option("--on-disk", options->onDisk, "The settings that its save finds")
      ->required()
      ->type_name("FILE");
  command->add_flag("--json", options->json, "For programs");
  command->footer(
      "Each FILE is a whole settings file in the binary, XML or JSON form. The result is that of\n"
      "the library's own save. An account that one of the files lacks is written, or left out, as\n"
      "a whole.\n\n"
      "Example:\n"
      "  account-settings explain-merge --in-memory mine.plist --original before.plist \\\n"
      "    --on-disk now.plist");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
