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

using accountsettings::AccountPtr;
using accountsettings::ASSBasicAccount;

nlohmann::json jsonOf(const ASSBasicAccount& account) {
  nlohmann::json json;
  json["identifier"] = orNull(storedIdentifier(account));
  json["type"] = account.type().value_or("");
  json["class"] = account.accountClass().value_or("");
  json["display_name"] = account.displayName().value_or("");
  json["enabled_dataclasses"] = shownDataclasses(account.enabledDataclasses());
  return json;
}

void showAsJson(AccountStore& store) {
  nlohmann::json accounts = nlohmann::json::array();
  for (const AccountPtr& account : *store.manager().allBasicAccounts()) {
    nlohmann::json json = jsonOf(*account);
    json["children"] = nlohmann::json::array();
    for (const FoundAccount& child : AccountStore::childrenOf(account))
      json["children"].push_back(jsonOf(*child.account));
    accounts.push_back(std::move(json));
  }
  printJson({{"image", store.image().rootPath()}, {"accounts", std::move(accounts)}});
}

void addRow(Table& table, const ASSBasicAccount& account, const char* indentation) {
  const std::string identifier = storedIdentifier(account);
  table.addRow({indentation + (identifier.empty() ? "-" : identifier), account.type().value_or(""),
                account.displayName().value_or(""),
                fmt::format("{}", fmt::join(shownDataclasses(account.enabledDataclasses()), " "))});
}

void printTable(AccountStore& store) {
  Table table({"ACCOUNT", "TYPE", "NAME", "ENABLED"});
  for (const AccountPtr& account : *store.manager().allBasicAccounts()) {
    addRow(table, *account, "");
    for (const FoundAccount& child : AccountStore::childrenOf(account))
      addRow(table, *child.account, "  ");
  }
  fmt::print("{}", table.text());
}

ExitCode run(const LookOptions& options) {
  AccountStore store(openImage(options.image));
  if (options.json)
    showAsJson(store);
  else
    printTable(store);
  warnOfUnusableEntries(store);
  return ExitCode::done;
}

}  // namespace

void addListCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<LookOptions>();
  CLI::App* const command = app.add_subcommand(
      "list", "List the accounts in the order of the file, children below their parent");
  addLookOptions(*command, *options);
  command->footer("Example:\n  account-settings list --image my-device");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
