#include "tools/account-settings/LibraryMerge.h"

#include <fmt/format.h>
#include <stdlib.h>

#include <cerrno>
#include <filesystem>
#include <map>
#include <system_error>

#include "tools/common/ExitCode.h"

namespace tools {

using accountsettings::AccountPtr;
using accountsettings::ASSAccountsManager;
using deviceimage::DeviceImage;
using propertylist::Dictionary;

namespace {

std::string newDirectory() {
  std::string path = (std::filesystem::temp_directory_path() / "account-settings-XXXXXX").string();
  if (::mkdtemp(path.data()) == nullptr)
    throw CommandFailure(ExitCode::unexpectedFailure,
                         fmt::format("cannot make {}: {}; set TMPDIR to a directory that can be "
                                     "written",
                                     path, std::generic_category().message(errno)));
  return path;
}

accountsettings::AccountsManagerPtr storeOf(const Dictionary& root) {
  const propertylist::Array* const accounts = propertylist::findArray(root, "Accounts");
  return ASSAccountsManager::initWithAccounsInfoArray(accounts != nullptr ? std::optional(*accounts)
                                                                          : std::nullopt);
}

[[noreturn]] void fail(const std::string& directory, const std::string& why) {
  throw CommandFailure(
      ExitCode::unexpectedFailure,
      fmt::format("the merge could not be tried out in {}: {}; see that there is room", directory,
                  why));
}

}  // namespace

LibraryMerge::LibraryMerge()
    : _directory(newDirectory()), _logLines(std::make_shared<std::vector<std::string>>()) {
  deviceimage::OpenedImage made = DeviceImage::create(_directory);
  if (!made.image) fail(_directory, made.error);
  _image = std::move(made.image);
  ::setenv("TMPDIR", _image->temporaryDirectory().c_str(), 1);  // where a save begins its file
  _services = installServices(_image, _logLines, false);
}

LibraryMerge::~LibraryMerge() {
  std::error_code ignored;
  std::filesystem::remove_all(_directory, ignored);
}

AccountVersions LibraryMerge::accountsOf(const Dictionary& root) {
  AccountVersions accounts;
  const auto store = storeOf(root);
  for (const AccountPtr& account : *store->allBasicAccounts())
    accounts.push_back({account->identifier().value_or(""), account->propertiesToSave()});
  return accounts;
}

AccountVersions LibraryMerge::originalsOf(const Dictionary& root) {
  AccountVersions accounts;
  const auto store = storeOf(root);
  for (const AccountPtr& account : *store->allBasicAccounts())
    accounts.push_back({account->identifier().value_or(""), account->originalProperties()});
  return accounts;
}

AccountVersions LibraryMerge::merge(const Dictionary& inMemory, const AccountVersions& original,
                                    const Dictionary& onDisk) {
  const platform::Status written = _image->writePropertyList(DeviceImage::kSettingsFile, onDisk);
  if (!written.isSuccess())
    fail(_directory, written.error ? written.error->description : "unknown reason");
  std::map<std::string, Dictionary> before;
  for (const AccountVersion& account : original) before[account.identifier] = account.properties;
  const auto store = storeOf(inMemory);
  for (const AccountPtr& account : *store->allBasicAccounts())
    account->setOriginalProperties(before[account->identifier().value_or("")]);
  store->saveAllAccounts();
  for (const std::string& line : *_logLines)
    if (line.starts_with("Failed to save accounts")) fail(_directory, line);
  const auto saved = _image->readPropertyList(DeviceImage::kSettingsFile);
  if (!saved.value || saved.value->asDictionary() == nullptr) fail(_directory, saved.error);
  return accountsOf(*saved.value->asDictionary());
}

}  // namespace tools
