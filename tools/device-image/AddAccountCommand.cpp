#include <fmt/format.h>

#include <map>
#include <memory>
#include <optional>
#include <vector>

#include "deviceimage/DeviceImageServices.h"
#include "tools/common/DataclassNames.h"
#include "tools/common/Images.h"
#include "tools/common/TypedProperty.h"
#include "tools/device-image/AccountTypes.h"
#include "tools/device-image/Commands.h"
#include "tools/device-image/Settings.h"
#include "tools/device-image/import/TextLines.h"

namespace tools {
namespace {

using propertylist::Dictionary;

// The type and identifier of the account that stands for the device itself.
constexpr std::string_view kDeviceLocalType = "OnMyDevice";
constexpr std::string_view kDeviceLocalIdentifier = "DeviceLocalAccount";
constexpr std::string_view kSyncIdentifierKey = "Sync Identifier";

struct Options {
  std::string directory, type, identifier, accountClass, displayName, username;
  std::optional<int> status;
  std::vector<std::string> enabled, children, properties;
};

// Sets the key unless the text is empty.
void setText(Dictionary& account, std::string_view key, const std::string& text) {
  if (text.empty()) return;
  if (!isText(text))
    throw CommandFailure(ExitCode::wrongUsage, fmt::format("the {} is not UTF-8 text", key));
  account.set(key, text);
}

void setEnabled(Dictionary& account, const std::vector<std::string>& names) {
  propertylist::Array enabled;
  for (const std::string& name : names) {
    const propertylist::Value identifier = dataclassIdentifierOf(name);
    if (!enabled.contains(identifier)) enabled.append(identifier);
  }
  if (!enabled.empty()) account.set(kEnabledDataclassesKey, enabled);
}

// Gives an account without an identifier one of its own, for its record and for its stores.
void setIdentifier(Dictionary& account, const std::string& identifier,
                   platform::UUIDGenerator& generator) {
  if (!identifier.empty()) return setText(account, kIdentifierKey, identifier);
  const std::optional<std::string> made = generator.generateUUID();
  if (!made)
    throw CommandFailure(ExitCode::unexpectedFailure, "the system makes no random numbers");
  account.set(kIdentifierKey, *made);
  account.set(kSyncIdentifierKey, *made);
}

std::string requireClass(const std::string& type, const std::string& accountClass) {
  const std::optional<std::string_view> usual = defaultClassOfType(type);
  if (!usual)
    throw CommandFailure(ExitCode::wrongUsage,
                         fmt::format("there is no account type \"{}\"; the device would drop the "
                                     "account; give one of {}",
                                     type, knownTypes()));
  return accountClass.empty() ? std::string(*usual) : accountClass;
}

// "type=CalDAV,class=...,identifier=...,display-name=...,enable=calendars"
Dictionary childOf(const std::string& text, platform::UUIDGenerator& generator) {
  std::map<std::string, std::string> fields;
  std::vector<std::string> enabled;
  for (std::size_t begin = 0; begin <= text.size();) {
    const std::size_t end = std::min(text.find(',', begin), text.size());
    const std::string field = text.substr(begin, end - begin);
    const std::size_t equals = field.find('=');
    const std::string key = field.substr(0, equals);
    if (equals == std::string::npos || (key != "type" && key != "class" && key != "identifier" &&
                                        key != "display-name" && key != "enable"))
      throw CommandFailure(ExitCode::wrongUsage,
                           fmt::format("\"{}\" in --child is not understood; write type=, class=, "
                                       "identifier=, display-name= or enable=",
                                       field));
    if (key == "enable")
      enabled.push_back(field.substr(equals + 1));
    else
      fields[key] = field.substr(equals + 1);
    begin = end + 1;
  }
  Dictionary child;
  child.set(kTypeKey, fields["type"]);
  setText(child, kClassKey, requireClass(fields["type"], fields["class"]));
  setIdentifier(child, fields["identifier"], generator);
  setText(child, kDisplayNameKey, fields["display-name"]);
  setEnabled(child, enabled);
  return child;
}

Dictionary accountOf(const Options& options, const platform::Services& services) {
  Dictionary account;
  account.set(kTypeKey, options.type);
  setText(account, kClassKey, requireClass(options.type, options.accountClass));
  const bool isNamedByItsType = options.identifier.empty() && options.type == kDeviceLocalType;
  setIdentifier(account,
                isNamedByItsType ? std::string(kDeviceLocalIdentifier) : options.identifier,
                services.uuidGenerator);
  setText(account, kDisplayNameKey, options.displayName);
  setText(account, kUsernameKey, options.username);
  setEnabled(account, options.enabled);
  if (options.status)
    account.set(services.accountFramework.QuillnetStatusKey(), std::int64_t{*options.status});
  propertylist::Array children;
  for (const std::string& child : options.children)
    children.append(childOf(child, services.uuidGenerator));
  if (!children.empty()) account.set(kChildAccountsKey, children);
  for (const std::string& property : options.properties) {
    auto [key, value] = typedProperty(property);
    if (account.contains(key))
      throw CommandFailure(ExitCode::wrongUsage,
                           fmt::format("the property \"{}\" is given twice", key));
    account.set(key, std::move(value));
  }
  if (auto problem = mailClassProblem(account))
    throw CommandFailure(ExitCode::wrongUsage, *problem);
  return account;
}

void requireNewIdentifiers(const Settings& settings, const Dictionary& account) {
  std::vector<Dictionary> all = dictionariesIn(account, kChildAccountsKey);
  all.push_back(account);
  std::map<std::string, int> uses;
  for (const Dictionary& one : all) {
    const std::string identifier = stringOrEmpty(one, kIdentifierKey);
    if (settings.usesIdentifier(identifier) || ++uses[identifier] > 1)
      throw CommandFailure(ExitCode::refused,
                           fmt::format("the identifier \"{}\" is taken; give another", identifier));
  }
}

ExitCode run(const Options& options) {
  const LockedImage locked = openImageForWriting(options.directory);
  const deviceimage::DeviceImageServices services(locked.image);
  const Dictionary account = accountOf(options, services.services());
  Settings settings(*locked.image);
  requireNewIdentifiers(settings, account);
  settings.addAccount(*locked.image, account);
  fmt::print("{}\n", stringOrEmpty(account, kIdentifierKey));
  return ExitCode::done;
}

}  // namespace

void addAddAccountCommand(CLI::App& app, ExitCode& outcome) {
  const auto options = std::make_shared<Options>();
  CLI::App* const command =
      app.add_subcommand("add-account", "Add an account; its identifier is printed");
  command->add_option("DIR", options->directory, "The image")->required();
  command->add_option("--type", options->type, "The account type, as \"Quillnet\"")->required();
  command->add_option(
      "--identifier", options->identifier,
      "Unique; otherwise a new UUID (\"DeviceLocalAccount\" for the type OnMyDevice)");
  command->add_option("--class", options->accountClass, "Otherwise the usual one of the type");
  command->add_option("--display-name", options->displayName, "The name that the user sees");
  command->add_option("--username", options->username, "The user's name at the service");
  command->add_option("--status", options->status,
                      "The service status; 1 says that the service has let the account go");
  command
      ->add_option("--enable", options->enabled, "A dataclass that is turned on; may be repeated")
      ->allow_extra_args(false);
  command
      ->add_option("--child", options->children,
                   "A child account: type=T,class=C,identifier=ID,display-name=N,enable=DATACLASS; "
                   "only type is required; may be repeated")
      ->allow_extra_args(false);
  command
      ->add_option(
          "--property", options->properties,
          "KEY=VALUE for a string, or KEY:KIND=VALUE, where KIND is integer, real, boolean, "
          "date, data or string; may be repeated")
      ->allow_extra_args(false);
  command->footer(
      "Example:\n"
      "  device-image add-account my-device --type Quillnet --identifier Q1 --status 1 \\\n"
      "    --display-name ada@quillnet.example --enable contacts --enable calendars \\\n"
      "    --child type=CalDAV,class=MobileCalDAVAccount,identifier=Q1-calendars \\\n"
      "    --property AccountPath=Mail/Quillnet-ada --property Port:integer=993");
  command->callback([options, &outcome] { outcome = run(*options); });
}

}  // namespace tools
