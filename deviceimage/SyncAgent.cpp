#include "deviceimage/SyncAgent.h"

namespace deviceimage {
namespace {

std::optional<std::string> stringIn(const propertylist::Dictionary& dictionary,
                                    std::string_view key) {
  const propertylist::Text* const found = propertylist::findString(dictionary, key);
  return found == nullptr ? std::nullopt : std::optional<std::string>(*found);
}

// The identifier of the account's child that holds its calendars.
std::optional<std::string> calendarChild(const propertylist::Dictionary& account) {
  std::optional<std::string> smallest;
  const propertylist::Array* const children = propertylist::findArray(account, "ChildAccounts");
  if (children == nullptr) return smallest;
  for (const propertylist::Value& child : *children) {
    const propertylist::Dictionary* const properties = child.asDictionary();
    if (properties == nullptr || stringIn(*properties, "Class") != "MobileCalDAVAccount") continue;
    const std::optional<std::string> identifier = stringIn(*properties, "Identifier");
    if (identifier && (!smallest || *identifier < *smallest)) smallest = identifier;
  }
  return smallest;
}

}  // namespace

SyncAgent::SyncAgent(const DeviceImage& image) {
  const std::optional<propertylist::Value> name =
      image.readProperty(*DeviceImage::preferencesFile(kApplication), kAccountNameKey);
  if (name && name->asString() != nullptr) _accountName = *name->asString();
}

std::optional<std::string> SyncAgent::quillnetStoreIdentifier() const {
  if (!_accountName) return std::nullopt;
  return std::string(kQuillnetStorePrefix) + *_accountName;
}

std::optional<std::string> SyncAgent::storeIdentifier(const propertylist::Dictionary& account,
                                                      Dataclass dataclass) const {
  if (isQuillnetType(stringIn(account, "Type").value_or(""))) {
    if (dataclass == Dataclass::calendars)
      if (std::optional<std::string> child = calendarChild(account)) return child;
    return quillnetStoreIdentifier();
  }
  for (const std::string_view key : {"Sync Identifier", "Identifier"}) {
    std::optional<std::string> identifier = stringIn(account, key);
    if (identifier && !identifier->empty()) return identifier;
  }
  return std::nullopt;
}

bool SyncAgent::isQuillnetType(std::string_view accountType) {
  return accountType == "Quillnet" || accountType == "VantorAccount";
}

}  // namespace deviceimage
