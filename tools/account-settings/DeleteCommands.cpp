#include <fmt/format.h>

#include <memory>

#include "tools/account-settings/Change.h"
#include "tools/account-settings/Commands.h"

namespace tools {
namespace {

struct Options : ChangeOptions {
  std::string identifier;
};

ExitCode runDelete(const Options& options) {
  return changeAccounts(options, [&](AccountStore& store) {
    const FoundAccount found = store.find(options.identifier);
    if (found.parent)
      throw CommandFailure(
          ExitCode::refused,
          fmt::format("\"{}\" is a child account of \"{}\"; nothing was changed; use "
                      "account-settings remove-child",
                      options.identifier, storedIdentifier(*found.parent)));
    store.manager().deleteAccount(found.account);
  });
}

ExitCode runRemoveChild(const Options& options) {
  return changeAccounts(options, [&](AccountStore& store) {
    const FoundAccount found = store.find(options.identifier);
    if (!found.parent)
      throw CommandFailure(ExitCode::refused,
                           fmt::format("\"{}\" is no child account; nothing was changed; use "
                                       "account-settings delete",
                                       options.identifier));
    store.manager().removeChildWithIdentifierFromAccount(options.identifier, found.parent);
  });
}

}  // namespace

void addDeleteCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command =
      app.add_subcommand("delete", "Delete an account with its child accounts");
  addIdentifier(*command, "ID", options->identifier, "The top-level account");
  addChangeOptions(*command, *options);
  command->footer(
      "The account's records stay in their stores.\n\n"
      "Example:\n  account-settings delete Q1 --image my-device --dry-run");
  command->callback([options, &outcome] { outcome = runDelete(*options); });
}

void addRemoveChildCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command =
      app.add_subcommand("remove-child", "Remove a child account from its parent");
  addIdentifier(*command, "ID", options->identifier, "The child account");
  addChangeOptions(*command, *options);
  command->footer("Example:\n  account-settings remove-child Q1C --image my-device");
  command->callback([options, &outcome] { outcome = runRemoveChild(*options); });
}

}  // namespace tools
