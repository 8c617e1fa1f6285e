#include "deviceimage/SyncAgent.h"

namespace deviceimage {
namespace {

std::optional<std::string_view> stringIn(const propertylist::Dictionary& dictionary,
                                         std::string_view key) {
  const propertylist::Text* const found = propertylist::findString(dictionary, key);
  return found == nullptr ? std::nullopt : std::optional<std::string_view>(*found);
}

// The identifier of the account's child that holds its calendars.
std::optional<std::string_view> calendarChild(const propertylist::Dictionary& account) {
  std::optional<std::string_view> smallest;
  const propertylist::Array* const children = propertylist::findArray(account, "ChildAccounts");
  if (children == nullptr) return smallest;
  for (const propertylist::Value& child : *children) {
    const propertylist::Dictionary* const properties = child.asDictionary();
    if (properties == nullptr || stringIn(*properties, "Class") != "MobileCalDAVAccount") continue;
    const std::optional<std::string_view> identifier = stringIn(*properties, "Identifier");
    if (identifier && (!smallest || *identifier < *smallest)) smallest = identifier;
  }
  return smallest;
}

std::optional<std::string> accountNameIn(const DeviceImage& image) {
  const std::optional<propertylist::Value> name = image.readProperty(
      *DeviceImage::preferencesFile(SyncAgent::kApplication), SyncAgent::kAccountNameKey);
  if (!name || name->asString() == nullptr) return std::nullopt;
  return std::string(*name->asString());
}

}  // namespace

SyncAgent::SyncAgent(const DeviceImage& image) : SyncAgent(accountNameIn(image)) {}

SyncAgent::SyncAgent(std::optional<std::string> accountName)
    : _accountName(std::move(accountName)) {
  if (_accountName) _quillnetStore = std::string(kQuillnetStorePrefix) + *_accountName;
}

std::optional<std::string_view> SyncAgent::storeIdentifier(const propertylist::Dictionary& account,
                                                           Dataclass dataclass) const {
  if (isQuillnetType(stringIn(account, "Type").value_or(""))) {
    if (dataclass == Dataclass::calendars)
      if (const std::optional<std::string_view> child = calendarChild(account)) return child;
    return _quillnetStore;
  }
  for (const std::string_view key : {"Sync Identifier", "Identifier"}) {
    const std::optional<std::string_view> identifier = stringIn(account, key);
    if (identifier && !identifier->empty()) return identifier;
  }
  return std::nullopt;
}

bool SyncAgent::isQuillnetType(std::string_view accountType) {
  return accountType == "Quillnet" || accountType == "VantorAccount";
}

}  // namespace deviceimage
