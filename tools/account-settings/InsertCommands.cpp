#include <fmt/format.h>

#include <memory>
#include <set>

#include "tools/account-settings/Change.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/Oddities.h"
#include "tools/account-settings/PropertyListInput.h"

namespace tools {
namespace {

using accountsettings::AccountPtr;
using accountsettings::ASSAccountsManager;
using accountsettings::ASSBasicAccount;
using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

constexpr std::string_view kLocalIdentifier = "DeviceLocalAccount";

struct Options : ChangeOptions {
  std::string parent;
  std::string file;
};

[[noreturn]] void refuse(const std::string& file, const std::string& why) {
  throw CommandFailure(ExitCode::refused, fmt::format("{}: {}; nothing was changed", file, why));
}

// The account dictionaries in the file: one, or an array of them.
Array accountsIn(const std::string& file) {
  const Value value = readPropertyListOfAnyForm(file);
  if (value.asArray() != nullptr) {
    if (value.asArray()->empty()) refuse(file, "it holds no account; give one");
    return *value.asArray();
  }
  if (value.asDictionary() == nullptr)
    refuse(file, "it holds neither an account's dictionary nor an array of them");
  if (propertylist::findArray(*value.asDictionary(), "Accounts") != nullptr)
    refuse(file,
           "it is a whole settings file; give one account's dictionary or the array \"Accounts\"");
  return Array{value};
}

// Refuses what the library would drop or pass over.
void requireUsable(const std::string& file, const Array& accounts) {
  const Dictionary root{{"Accounts", accounts}, {"Version", ASSAccountsManager::currentVersion()}};
  for (const Oddity& oddity : findOddities(root))
    if (oddity.effect != Oddity::Effect::none) refuse(file, describe(oddity));
}

// Refuses an identifier under which nobody would find the account again.
void requireIdentifier(const std::string& file, const Dictionary& account) {
  const Value* const identifier = account.find(accountsettings::kAccountIdentifier);
  if (identifier == nullptr) return;  // it gets a new one
  const propertylist::Text* const text = identifier->asString();
  if (text == nullptr || text->empty())
    refuse(file, "an account's \"Identifier\" is empty or no string; leave it out for a new one");
  const propertylist::Text* const type =
      propertylist::findString(account, accountsettings::kAccountType);
  const bool isLocal = type != nullptr && *type == accountsettings::kOnMyDeviceAccountType;
  if (isLocal && *text != kLocalIdentifier)
    refuse(file, fmt::format("the device's own account, of the type \"{}\", has the identifier "
                             "\"{}\" and no other",
                             *type, kLocalIdentifier));
}

void requireChild(const std::string& file, const AccountPtr& child) {
  requireIdentifier(file, child->properties());
  if (child->type() == accountsettings::kOnMyDeviceAccountType)
    refuse(file, fmt::format("the device's own account, of the type \"{}\", is nobody's child",
                             accountsettings::kOnMyDeviceAccountType));
}

// Refuses what the store would not find again.
void requireNamed(const std::string& file, const Array& accounts,
                  const std::vector<AccountPtr>& made) {
  for (const Value& account : accounts) requireIdentifier(file, *account.asDictionary());
  for (const AccountPtr& account : made)
    for (const FoundAccount& child : AccountStore::childrenOf(account))
      requireChild(file, child.account);
}

// Refuses an account whose identifier, or a child's, the store has already.
void requireNew(const std::string& file, const AccountStore& store,
                const std::vector<AccountPtr>& accounts) {
  const std::vector<std::string> known = store.identifiers();
  const std::set<std::string> taken(known.begin(), known.end());
  const auto requireFree = [&](const AccountPtr& account) {
    const std::string identifier = account->identifier().value_or("");
    if (taken.contains(identifier))
      refuse(file, fmt::format("the identifier \"{}\" is taken in {}; give another, or delete that "
                               "account first",
                               identifier, store.image().settingsFile()));
  };
  for (const AccountPtr& account : accounts) {
    requireFree(account);
    for (const FoundAccount& child : AccountStore::childrenOf(account)) requireFree(child.account);
  }
}

ExitCode runInsert(const Options& options) {
  const Array accounts = accountsIn(options.file);
  return changeAccounts(options, [&](AccountStore& store) {
    requireUsable(options.file, accounts);
    const auto made = ASSAccountsManager::initWithAccounsInfoArray(accounts);
    requireNamed(options.file, accounts, *made->allBasicAccounts());
    requireNew(options.file, store, *made->allBasicAccounts());
    for (const AccountPtr& account : *made->allBasicAccounts())
      store.manager().insertAccount(account);
  });
}

ExitCode runAddChild(const Options& options) {
  const Array children = accountsIn(options.file);
  if (children.size() != 1) refuse(options.file, "it holds more than one account; give one child");
  return changeAccounts(options, [&](AccountStore& store) {
    const FoundAccount parent = store.find(options.parent);
    if (parent.parent)
      refuse(options.file,
             fmt::format("\"{}\" is a child account itself, of \"{}\", and can have no children",
                         options.parent, storedIdentifier(*parent.parent)));
    const Value* const siblings =
        parent.account->properties().find(accountsettings::kAccountChildAccounts);
    if (siblings != nullptr && siblings->asArray() == nullptr)
      refuse(options.file,
             fmt::format("\"{}\" has \"ChildAccounts\" that are no array, which would be replaced; "
                         "mend them in {} first",
                         options.parent, store.image().settingsFile()));
    const Dictionary* const properties = children[0].asDictionary();
    if (properties != nullptr) requireIdentifier(options.file, *properties);
    const AccountPtr child =
        properties != nullptr ? ASSBasicAccount::initWithProperties(*properties) : nullptr;
    if (!child) return requireUsable(options.file, children);
    if (properties->contains(accountsettings::kAccountChildAccounts))
      refuse(options.file, "the child has \"ChildAccounts\"; a child account has no children");
    requireChild(options.file, child);
    requireNew(options.file, store, {child});
    store.manager().addChildToAccount(child, parent.account);
  });
}

}  // namespace

void addInsertCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command =
      app.add_subcommand("insert", "Append accounts; their identifiers are printed");
  command
      ->add_option("FILE", options->file,
                   "A property list, in the binary, XML or JSON form, with one account's "
                   "dictionary or an array of them")
      ->required();
  addChangeOptions(*command, *options);
  command->footer(
      "All accounts are inserted or none. One without an \"Identifier\" gets a new one.\n\n"
      "Example:\n"
      "  echo '{\"Type\": \"CardDAV\", \"Class\": \"CardDAVAccount\"}' >account.json\n"
      "  account-settings insert account.json --image my-device");
  command->callback([options, &outcome] { outcome = runInsert(*options); });
}

void addAddChildCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command =
      app.add_subcommand("add-child", "Add a child account; its identifier is printed");
  addIdentifier(*command, "PARENT", options->parent, "The top-level account");
  command
      ->add_option("FILE", options->file,
                   "A property list, in the binary, XML or JSON form, with the child's dictionary")
      ->required();
  addChangeOptions(*command, *options);
  command->footer("Example:\n  account-settings add-child Q1 child.json --image my-device");
  command->callback([options, &outcome] { outcome = runAddChild(*options); });
}

}  // namespace tools
