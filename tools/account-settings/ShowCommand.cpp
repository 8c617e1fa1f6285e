#include <fmt/format.h>

#include <memory>
#include <nlohmann/json.hpp>

#include "tools/account-settings/AccountStore.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/Options.h"
#include "tools/account-settings/Shown.h"
#include "tools/common/Images.h"
#include "tools/common/Table.h"

namespace tools {
namespace {

using accountsettings::ASSBasicAccount;
using propertylist::Dictionary;

struct Options : LookOptions {
  std::string identifier;
};

// What a child answers from its parent.
Dictionary inheritedProperties(const FoundAccount& found) {
  Dictionary inherited;
  if (!found.parent) return inherited;
  for (const Dictionary::Entry& entry : found.parent->properties())
    if (!found.account->properties().contains(entry.key()) &&
        entry.key() != accountsettings::kAccountChildAccounts)
      inherited.set(entry.key(), entry.value());
  return inherited;
}

std::vector<std::string> childIdentifiers(const FoundAccount& found) {
  std::vector<std::string> identifiers;
  if (found.parent) return identifiers;
  for (const FoundAccount& child : AccountStore::childrenOf(found.account))
    identifiers.push_back(storedIdentifier(*child.account));
  return identifiers;
}

void showAsJson(const FoundAccount& found) {
  const ASSBasicAccount& account = *found.account;
  nlohmann::json json;
  json["identifier"] = orNull(storedIdentifier(account));
  json["sync_identifier"] = orNull(account.syncStoreIdentifier().value_or(""));
  json["type"] = account.type().value_or("");
  json["class"] = account.accountClass().value_or("");
  json["display_name"] = account.displayName().value_or("");
  json["parent"] = found.parent ? orNull(storedIdentifier(*found.parent)) : nlohmann::json();
  json["children"] = childIdentifiers(found);
  json["supported_dataclasses"] = shownDataclasses(account.supportedDataclasses());
  json["provisioned_dataclasses"] = shownDataclasses(account.provisionedDataclasses());
  json["enabled_dataclasses"] = shownDataclasses(account.enabledDataclasses());
  json["properties"] = jsonFormOf(account.properties());
  json["inherited_properties"] = jsonFormOf(inheritedProperties(found));
  printJson(json);
}

std::string joined(const std::vector<std::string>& names) {
  return names.empty() ? "-" : fmt::format("{}", fmt::join(names, " "));
}

std::string orDash(const std::optional<std::string>& text) {
  return text && !text->empty() ? *text : "-";
}

// A child follows its parent as long as that has dataclasses turned on.
bool followsParent(const FoundAccount& found) {
  const auto ofParent = found.parent ? found.parent->enabledDataclasses() : std::nullopt;
  return ofParent && !ofParent->empty();
}

void printTables(const FoundAccount& found) {
  const ASSBasicAccount& account = *found.account;
  Table summary({"ACCOUNT", orDash(storedIdentifier(account))});
  summary.addRow({"TYPE", orDash(account.type())});
  summary.addRow({"CLASS", orDash(account.accountClass())});
  summary.addRow({"NAME", orDash(account.displayName())});
  summary.addRow({"SYNC STORE", orDash(account.syncStoreIdentifier())});
  summary.addRow({"PARENT", found.parent ? orDash(storedIdentifier(*found.parent)) : "-"});
  summary.addRow({"CHILDREN", joined(childIdentifiers(found))});
  summary.addRow({"SUPPORTED", joined(shownDataclasses(account.supportedDataclasses()))});
  summary.addRow({"PROVISIONED", joined(shownDataclasses(account.provisionedDataclasses()))});
  summary.addRow({"ENABLED", joined(shownDataclasses(account.enabledDataclasses())) +
                                 (followsParent(found) ? " (as the parent)" : "")});
  Table properties({"PROPERTY", "KIND", "FROM", "VALUE"});
  for (const Dictionary::Entry& entry : account.properties())
    properties.addRow({entry.key(), kindName(entry.value()), "own", shownValue(entry.value())});
  for (const Dictionary::Entry& entry : inheritedProperties(found))
    properties.addRow({entry.key(), kindName(entry.value()), "parent", shownValue(entry.value())});
  fmt::print("{}\n{}", summary.text(), properties.text());
}

ExitCode run(const Options& options) {
  const AccountStore store(openImage(options.image));
  const FoundAccount found = store.find(options.identifier);
  if (options.json)
    showAsJson(found);
  else
    printTables(found);
  return ExitCode::done;
}

}  // namespace

void addShowCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand(
      "show", "Show one account: its properties, its dataclasses, its parent and children");
  addIdentifier(*command, "ID", options->identifier, "The account, or child account");
  addLookOptions(*command, *options);
  command->footer(
      "SUPPORTED is what the account's type can do, PROVISIONED what the service and the\n"
      "configuration profiles leave of it, ENABLED what is turned on.\n\n"
      "Example:\n  account-settings show Q1 --image my-device");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
