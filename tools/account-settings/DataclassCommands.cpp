#include <fmt/format.h>

#include <memory>

#include "tools/account-settings/Change.h"
#include "tools/account-settings/Commands.h"
#include "tools/account-settings/Shown.h"
#include "tools/common/DataclassNames.h"
#include "tools/common/Program.h"

namespace tools {
namespace {

using accountsettings::ASSBasicAccount;
using accountsettings::ASSDeviceLocalAccount;
using accountsettings::StringList;

struct Options : ChangeOptions {
  std::string identifier;
  std::vector<std::string> dataclasses;
};

void requireSupport(const ASSBasicAccount& account, const std::string& dataclass) {
  const StringList supported = account.supportedDataclasses();
  if (accountsettings::contains(supported, dataclass)) return;
  const std::vector<std::string> shown = shownDataclasses(supported);
  throw CommandFailure(
      ExitCode::refused,
      fmt::format("\"{}\" is of the type \"{}\", which does not support {}; nothing was changed; "
                  "it supports {}",
                  storedIdentifier(account), account.type().value_or(""), shownDataclass(dataclass),
                  shown.empty() ? "none" : fmt::format("{}", fmt::join(shown, ", "))));
}

bool isStoredAsEnabled(const ASSBasicAccount& account, const std::string& dataclass) {
  const auto stored = accountsettings::stringsOfArray(
      account.properties().find(accountsettings::kAccountEnabledDataclasses));
  return stored && accountsettings::contains(*stored, dataclass);
}

// The device-local account changes its list only after the device has turned the dataclass on or
// off, which a dry run leaves alone.
void toggle(AccountStore& store, ASSBasicAccount& account, const std::string& dataclass,
            bool enabled, bool dryRun) {
  if (dryRun && dynamic_cast<ASSDeviceLocalAccount*>(&account) != nullptr)
    account.ASSBasicAccount::setEnabledForDataclass(enabled, dataclass);
  else
    account.setEnabledForDataclass(enabled, dataclass);
  if (isStoredAsEnabled(account, dataclass) == enabled) return;
  throw CommandFailure(
      ExitCode::unexpectedFailure,
      fmt::format("{}: {} was not turned {}, and nothing was saved: {}; see device-image check {}",
                  store.image().settingsFile(), shownDataclass(dataclass), enabled ? "on" : "off",
                  store.logLines().empty() ? "the library said nothing" : store.logLines().back(),
                  store.image().rootPath()));
}

// Turns dataclasses on or off, and back again. For the account of the device itself that reaches
// the device at once, before the accounts are saved.
class Toggling {
 public:
  Toggling(bool enabled, bool dryRun) : _enabled(enabled), _dryRun(dryRun) {}

  void toggleAll(AccountStore& store, const FoundAccount& found, const StringList& dataclasses) {
    _account = found.account;
    for (const std::string& dataclass : dataclasses) {
      if (isStoredAsEnabled(*_account, dataclass) == _enabled) continue;
      toggle(store, *_account, dataclass, _enabled, _dryRun);
      _toggled.push_back(dataclass);
    }
  }

  // What to add to the message of a failure; nothing when the device was not reached.
  std::string takeBack() const {
    if (_toggled.empty() || _dryRun || !std::dynamic_pointer_cast<ASSDeviceLocalAccount>(_account))
      return {};
    StringList left;
    for (const std::string& dataclass : _toggled) {
      _account->setEnabledForDataclass(!_enabled, dataclass);
      if (isStoredAsEnabled(*_account, dataclass) == _enabled)
        left.push_back(shownDataclass(dataclass));
    }
    if (left.empty())
      return fmt::format("; on the device {} turned {} again",
                         fmt::join(shownDataclasses(_toggled), ", "), _enabled ? "off" : "on");
    return fmt::format(
        "; on the device {} could not be turned {} again, unlike in the settings "
        "file: repeat the command, or its opposite, when the cause is mended",
        fmt::join(left, ", "), _enabled ? "off" : "on");
  }

 private:
  bool _enabled;
  bool _dryRun;
  accountsettings::AccountPtr _account;
  StringList _toggled;
};

// Why a list that was changed does not take effect.
void warnOfNoEffect(const ASSBasicAccount& account, const StringList& dataclasses, bool enabled) {
  for (const std::string& dataclass : dataclasses) {
    if (account.isEnabledForDataclass(dataclass) == enabled) continue;
    const auto& parent = account.parentAccount();
    const auto ofParent = parent ? parent->enabledDataclasses() : std::nullopt;
    printMessage(
        ofParent && !ofParent->empty()
            ? fmt::format("note: \"{}\" follows its parent \"{}\" as long as that has dataclasses "
                          "turned on; what it stores itself takes no effect",
                          storedIdentifier(account), storedIdentifier(*parent))
            : fmt::format("note: {} takes no effect: \"{}\" is not provisioned for it (see "
                          "account-settings show)",
                          shownDataclass(dataclass), storedIdentifier(account)));
    return;
  }
}

ExitCode run(const Options& options, bool enabled) {
  StringList dataclasses;
  for (const std::string& name : options.dataclasses)
    dataclasses.push_back(dataclassIdentifierOf(name));
  Toggling toggling(enabled, options.dryRun);
  const auto edit = [&](AccountStore& store) {
    const FoundAccount found = store.find(options.identifier);
    for (const std::string& dataclass : dataclasses) requireSupport(*found.account, dataclass);
    toggling.toggleAll(store, found, dataclasses);
    store.update(found);
    warnOfNoEffect(*found.account, dataclasses, enabled);
  };
  return changeAccounts(options, edit, [&] { return toggling.takeBack(); });
}

void addCommand(CLI::App& app, ExitCode& outcome, bool enabled) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command =
      enabled ? app.add_subcommand("enable", "Turn dataclasses of an account on")
              : app.add_subcommand("disable", "Turn dataclasses of an account off");
  addIdentifier(*command, "ID", options->identifier, "The account, or child account");
  command
      ->add_option("DATACLASS", options->dataclasses,
                   "mail, contacts, calendars, reminders, bookmarks, notes, or a whole identifier "
                   "such as com.vantor.Dataclass.Backup")
      ->required();
  addChangeOptions(*command, *options);
  command->footer(fmt::format("Example:\n  account-settings {} Q1 contacts notes --image my-device",
                              enabled ? "enable" : "disable"));
  command->callback([options, enabled, &outcome] { outcome = run(*options, enabled); });
}

}  // namespace

void addEnableCommand(CLI::App& app, ExitCode& outcome) { addCommand(app, outcome, true); }

void addDisableCommand(CLI::App& app, ExitCode& outcome) { addCommand(app, outcome, false); }

}  // namespace tools
