#include "tools/account-settings/AccountStore.h"

#include <fmt/format.h>

#include <utility>

#include "platform/InternalConsistencyFailure.h"
#include "tools/account-settings/NearestNames.h"
#include "tools/common/ExitCode.h"
#include "tools/common/Installation.h"

namespace tools {

using accountsettings::AccountPtr;
using accountsettings::ASSAccountsManager;
using accountsettings::ASSBasicAccount;
using deviceimage::DeviceImage;
using propertylist::Array;
using propertylist::Dictionary;

namespace {

Dictionary readRoot(const DeviceImage& image) {
  const propertylist::FileReadResult read = image.readPropertyList(DeviceImage::kSettingsFile);
  if (!read.exists) return {};
  if (read.value && read.value->asDictionary() != nullptr) return *read.value->asDictionary();
  throw CommandFailure(
      ExitCode::imageDamaged,
      fmt::format("{}: {}; nothing was changed; repair the file or put a saved copy in its place",
                  image.settingsFile(), read.value ? "it holds no dictionary" : read.error));
}

const Array* childDictionaries(const AccountPtr& parent) {
  return propertylist::findArray(parent->properties(), accountsettings::kAccountChildAccounts);
}

}  // namespace

std::unique_ptr<deviceimage::DeviceImageServices> installServices(
    const ImagePtr& image, const std::shared_ptr<std::vector<std::string>>& lines, bool writesLog) {
  deviceimage::ServiceOptions options;
  options.processName = "account-settings";
  options.writesLog = writesLog;
  options.logSink = [lines](std::string_view line) { lines->emplace_back(line); };
  options.resourceDirectory = installedAccountResources();
  auto services = std::make_unique<deviceimage::DeviceImageServices>(image, std::move(options));
  platform::install(services->services());
  try {
    ASSBasicAccount::initialize();
  } catch (const platform::InternalConsistencyFailure& failure) {
    throw CommandFailure(
        ExitCode::unexpectedFailure,
        fmt::format("{}/AccountTypesProperties.plist: {}; nothing was changed; install "
                    "account-settings and its plug-in again",
                    installedAccountResources(), failure.what()));
  }
  return services;
}

std::string storedIdentifier(const ASSBasicAccount& account) {
  const bool isNew = !account.originalProperties().contains(accountsettings::kAccountIdentifier) &&
                     account.type() != accountsettings::kOnMyDeviceAccountType;
  return isNew ? std::string() : account.identifier().value_or("");
}

AccountStore::AccountStore(ImagePtr image)
    : _image(std::move(image)),
      _logLines(std::make_shared<std::vector<std::string>>()),
      _services(installServices(_image, _logLines, false)),
      _root(readRoot(*_image)),
      _manager(ASSAccountsManager::init()) {}

void AccountStore::startLogging() { _services = installServices(_image, _logLines, true); }

std::vector<FoundAccount> AccountStore::_all() const {
  std::vector<FoundAccount> all;
  for (const AccountPtr& account : *_manager->allBasicAccounts()) {
    all.push_back({account, nullptr, 0});
    const std::vector<FoundAccount> children = childrenOf(account);
    all.insert(all.end(), children.begin(), children.end());
  }
  return all;
}

std::vector<std::string> AccountStore::identifiers() const {
  std::vector<std::string> identifiers;
  for (const FoundAccount& account : _all())
    identifiers.push_back(storedIdentifier(*account.account));
  return identifiers;
}

FoundAccount AccountStore::find(std::string_view identifier) const {
  std::vector<FoundAccount> found;
  for (const FoundAccount& account : _all())
    if (storedIdentifier(*account.account) == identifier) found.push_back(account);
  if (found.size() == 1) return found.front();
  if (found.size() > 1)
    throw CommandFailure(
        ExitCode::refused,
        fmt::format("{}: {} accounts have the identifier \"{}\"; "
                    "account-settings validate --image {} says where",
                    _image->settingsFile(), found.size(), identifier, _image->rootPath()));
  throw CommandFailure(
      ExitCode::refused,
      fmt::format("{}: there is no account \"{}\"{}; account-settings list --image {} lists them",
                  _image->settingsFile(), identifier, suggestion(identifier, identifiers()),
                  _image->rootPath()));
}

std::vector<FoundAccount> AccountStore::childrenOf(const AccountPtr& parent) {
  std::vector<FoundAccount> children;
  const Array* const dictionaries = childDictionaries(parent);
  if (dictionaries == nullptr) return children;
  for (std::size_t i = 0; i < dictionaries->size(); ++i) {
    const Dictionary* const properties = (*dictionaries)[i].asDictionary();
    const AccountPtr child =
        properties != nullptr ? ASSBasicAccount::initWithProperties(*properties) : nullptr;
    if (!child) continue;
    child->setParentAccount(parent);
    children.push_back({child, parent, i});
  }
  return children;
}

void AccountStore::update(const FoundAccount& changed) {
  if (!changed.parent) return;  // the store's own record
  Array children = *childDictionaries(changed.parent);
  children.replace(changed.index, changed.account->properties());
  changed.parent->setAccountPropertyForKey(children, accountsettings::kAccountChildAccounts);
  _manager->updateAccount(changed.parent);
}

std::vector<Dictionary> AccountStore::snapshot() const {
  std::vector<Dictionary> accounts;
  for (const AccountPtr& account : *_manager->allBasicAccounts())
    accounts.push_back(account->propertiesToSave());
  return accounts;
}

}  // namespace tools
