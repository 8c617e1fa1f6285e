#include <fmt/format.h>

#include <memory>

#include "tools/account-settings/Change.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/Shown.h"
#include "tools/common/Program.h"
#include "tools/common/Text.h"
#include "tools/common/TypedProperty.h"

namespace tools {
namespace {

namespace as = accountsettings;

struct Options : ChangeOptions {
  std::string identifier;
  std::string key;
  std::string value;
};

void refuse(const std::string& key, const std::string& why) {
  throw CommandFailure(ExitCode::refused, fmt::format("\"{}\" is not changed: {}", key, why));
}

// The keys that no command may set or take away.
void requireFreeKey(const std::string& key) {
  if (key == as::kAccountType || key == as::kAccountClass)
    refuse(key,
           "the library keeps an account's type and class as it was made with; delete the account "
           "and insert another");
  if (key == as::kAccountIdentifier)
    refuse(key,
           "the library knows the account and merges it by its identifier; delete the account and "
           "insert another");
  if (key == as::kAccountChildAccounts)
    refuse(key, "the child accounts are changed with add-child and remove-child");
}

ExitCode runSet(const Options& options) {
  auto [key, kind] = typedKey(options.key);
  if (key.empty() || !isText(key))
    throw CommandFailure(ExitCode::wrongUsage,
                         fmt::format("\"{}\" is no key; write KEY or KEY:KIND", options.key));
  const propertylist::Value value =
      typedValue(kind, options.value, options.key + " " + options.value);
  requireFreeKey(key);
  if (key == as::kAccountEnabledDataclasses || key == as::kAccountProvisionedDataclasses)
    refuse(key, "it is a list; enable and disable change what is enabled");
  return changeAccounts(options, [&, &name = key](AccountStore& store) {
    const FoundAccount found = store.find(options.identifier);
    const propertylist::Value* const current = found.account->properties().find(name);
    if (current != nullptr && *current == value) return;
    if (current != nullptr && current->kind() != value.kind() && options.key == name)
      printMessage(
          fmt::format("note: \"{}\" was of the kind {} and is a string now; {}:{} keeps "
                      "the kind",
                      name, kindName(*current), name, kindName(*current)));
    found.account->setAccountPropertyForKey(value, name);
    store.update(found);
  });
}

ExitCode runUnset(const Options& options) {
  requireFreeKey(options.key);
  return changeAccounts(options, [&](AccountStore& store) {
    const FoundAccount found = store.find(options.identifier);
    if (!found.account->properties().contains(options.key)) {
      if (found.account->accountPropertyForKey(options.key) != nullptr)
        refuse(options.key,
               fmt::format("\"{}\" has it from its parent \"{}\"; unset it there",
                           options.identifier, found.parent->identifier().value_or("")));
      return;
    }
    found.account->removeAccountPropertyForKey(options.key);
    store.update(found);
  });
}

}  // namespace

void addSetCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand("set", "Set a property of an account");
  addIdentifier(*command, "ID", options->identifier, "The account, or child account");
  command
      ->add_option("KEY", options->key,
                   "KEY for a string, or KEY:KIND, where KIND is string, integer, real, boolean, "
                   "date (ISO 8601) or data (hexadecimal digits)")
      ->required();
  command->add_option("VALUE", options->value, "Behind \"--\" when it begins with \"-\"")
      ->required();
  addChangeOptions(*command, *options);
  command->footer(
      "Examples:\n"
      "  account-settings set Q1 DisplayName \"Ada at home\" --image my-device\n"
      "  account-settings set Q1 PortNumber:integer 993 --image my-device --dry-run\n"
      "  account-settings set Q1 Offset:integer --image my-device -- -5");
  command->callback([options, &outcome] { outcome = runSet(*options); });
}

void addUnsetCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command = app.add_subcommand("unset", "Remove a property of an account");
  addIdentifier(*command, "ID", options->identifier, "The account, or child account");
  command->add_option("KEY", options->key, "The property; one that is not there is no failure")
      ->required();
  addChangeOptions(*command, *options);
  command->footer("Example:\n  account-settings unset Q1 PortNumber --image my-device");
  command->callback([options, &outcome] { outcome = runUnset(*options); });
}

}  // namespace tools
