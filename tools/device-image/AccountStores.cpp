#include "tools/device-image/AccountStores.h"

#include <fmt/format.h>

#include <map>
#include <utility>

#include "deviceimage/SyncAgent.h"
#include "tools/common/ExitCode.h"
#include "tools/device-image/Settings.h"

namespace tools {

using deviceimage::Dataclass;
using deviceimage::DeviceImage;
using deviceimage::SyncAgent;
using propertylist::Dictionary;

ChosenStore chooseStore(const DeviceImage& image, Dataclass dataclass, const std::string& account) {
  if (account.empty()) return {std::nullopt, "the local store"};
  const std::optional<Dictionary> properties = Settings(image).findAccount(account);
  if (!properties)
    throw CommandFailure(
        ExitCode::refused,
        fmt::format("{}: there is no account \"{}\"; `device-image show` lists the accounts",
                    image.settingsFile(), account));
  // The device's own account has no store of a service.
  if (stringOrEmpty(*properties, kTypeKey) == "OnMyDevice")
    return {std::nullopt, fmt::format("the local store (account {})", account)};
  const SyncAgent agent(image);
  const std::optional<std::string_view> identifier = agent.storeIdentifier(*properties, dataclass);
  if (!identifier)
    throw CommandFailure(
        ExitCode::refused,
        fmt::format("{}: the sync agent has no account name, so the account \"{}\" has no store; "
                    "make the image with --sync-account-name",
                    image.absolutePath(*DeviceImage::preferencesFile(SyncAgent::kApplication)),
                    account));
  std::string description = fmt::format("store \"{}\" of account {}", *identifier, account);
  return {std::string(*identifier), std::move(description)};
}

class StoreNames::Accounts {
 public:
  explicit Accounts(const DeviceImage& image) {
    const SyncAgent agent(image);
    for (const Dictionary& account : Settings(image).accounts())
      for (const Dataclass dataclass : deviceimage::kDataclasses)
        if (const auto store = agent.storeIdentifier(account, dataclass))
          // Of several accounts with one store the first in the file gives the name.
          _names.try_emplace({deviceimage::syncTypeOf(dataclass), std::string(*store)},
                             stringOrEmpty(account, kIdentifierKey));
  }
  std::string nameOf(Dataclass dataclass, const std::string& storeIdentifier) const {
    const auto found = _names.find({deviceimage::syncTypeOf(dataclass), storeIdentifier});
    return found == _names.end() || found->second.empty() ? storeIdentifier : found->second;
  }

 private:
  std::map<std::pair<platform::SyncDataType, std::string>, std::string> _names;
};

StoreNames::StoreNames(const DeviceImage& image) : _accounts(std::make_unique<Accounts>(image)) {}

StoreNames::~StoreNames() = default;

std::string StoreNames::nameOf(const deviceimage::Store& store) const {
  if (!store.account) return "local";
  // The account of a retired store may be gone, and another may have taken over its store's name.
  return store.retired ? *store.account : _accounts->nameOf(store.dataclass, *store.account);
}

}  // namespace tools
