#include "accountsdatamigrator/OlderSettings.h"

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "QuillnetAccountTypeRemoval/PropertyNumbers.h"
#include "platform/Services.h"

namespace accountsdatamigrator {

using namespace accountsettings;
using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

namespace {

bool identifyAll(Dictionary& holder, std::string_view key, bool areChildren);

bool identify(Dictionary& account, bool isChild) {
  const propertylist::Text* const type = propertylist::findString(account, kAccountType);
  // A child of that type is like any other.
  const bool isDevice = !isChild && type != nullptr && *type == kOnMyDeviceAccountType;
  if (!isDevice && propertylist::findString(account, kAccountIdentifier) == nullptr) {
    const std::optional<std::string> made = platform::services().uuidGenerator.generateUUID();
    if (!made) return false;
    account.set(kAccountIdentifier, *made);
  }
  return isChild || identifyAll(account, kAccountChildAccounts, true);
}

// Every account of the list under `key`; what is no list, and what is no account, stays as it is.
bool identifyAll(Dictionary& holder, std::string_view key, bool areChildren) {
  const Array* const list = propertylist::findArray(holder, key);
  if (list == nullptr) return true;
  Array accounts = *list;
  for (std::size_t index = 0; index < accounts.size(); ++index) {
    if (accounts[index].asDictionary() == nullptr) continue;
    Dictionary account = *accounts[index].asDictionary();
    if (!identify(account, areChildren)) return false;
    accounts.replace(index, std::move(account));
  }
  holder.set(key, std::move(accounts));
  return true;
}

}  // namespace

bool isOutdated(const Dictionary& root) {
  const Value* const version = root.find("Version");
  return version != nullptr && static_cast<std::uint64_t>(integerValue(version)) < kSettingsVersion;
}

std::optional<Dictionary> broughtUpToDate(Dictionary root) {
  if (!identifyAll(root, "Accounts", false)) return std::nullopt;
  root.set("Version", kSettingsVersion);
  return root;
}

}  // namespace accountsdatamigrator
