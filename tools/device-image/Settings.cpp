#include "tools/device-image/Settings.h"

#include <fmt/format.h>

#include <algorithm>

#include "tools/common/ExitCode.h"

namespace tools {

using deviceimage::DeviceImage;
using propertylist::Dictionary;

namespace {

constexpr int kSettingsVersion = 12;
constexpr std::string_view kVersionKey = "Version";

[[noreturn]] void failUnreadable(const DeviceImage& image, const std::string& why) {
  throw CommandFailure(ExitCode::imageDamaged,
                       fmt::format("{}: {}; repair the file or put a saved copy in its place",
                                   image.settingsFile(), why));
}

}  // namespace

std::vector<Dictionary> dictionariesIn(const Dictionary& dictionary, std::string_view key) {
  std::vector<Dictionary> found;
  const propertylist::Array* const values = propertylist::findArray(dictionary, key);
  if (values == nullptr) return found;
  for (const propertylist::Value& value : *values)
    if (value.asDictionary() != nullptr) found.push_back(*value.asDictionary());
  return found;
}

std::string stringOrEmpty(const Dictionary& dictionary, std::string_view key) {
  const propertylist::Text* const found = propertylist::findString(dictionary, key);
  return found == nullptr ? std::string() : *found;
}

Settings::Settings(const DeviceImage& image) {
  const propertylist::FileReadResult read = image.readPropertyList(DeviceImage::kSettingsFile);
  if (!read.exists) return;
  if (!read.value) failUnreadable(image, read.error);
  if (read.value->asDictionary() == nullptr) failUnreadable(image, "it holds no dictionary");
  _root = *read.value->asDictionary();
}

std::vector<Dictionary> Settings::accounts() const { return dictionariesIn(_root, kAccountsKey); }

std::optional<Dictionary> Settings::findAccount(std::string_view identifier) const {
  for (Dictionary& account : accounts())
    if (stringOrEmpty(account, kIdentifierKey) == identifier) return account;
  return std::nullopt;
}

bool Settings::usesIdentifier(std::string_view identifier) const {
  const auto has = [&](const Dictionary& account) {
    return stringOrEmpty(account, kIdentifierKey) == identifier;
  };
  const std::vector<Dictionary> all = accounts();
  return std::any_of(all.begin(), all.end(), [&](const Dictionary& account) {
    const std::vector<Dictionary> children = dictionariesIn(account, kChildAccountsKey);
    return has(account) || std::any_of(children.begin(), children.end(), has);
  });
}

void Settings::addAccount(const DeviceImage& image, const Dictionary& account) {
  const propertylist::Array* const current = propertylist::findArray(_root, kAccountsKey);
  propertylist::Array all = current == nullptr ? propertylist::Array() : *current;
  all.append(account);
  _root.set(kAccountsKey, all);
  if (!_root.contains(kVersionKey)) _root.set(kVersionKey, kSettingsVersion);
  const platform::Status written = image.writePropertyList(DeviceImage::kSettingsFile, _root);
  if (!written.isSuccess())
    throw CommandFailure(
        ExitCode::refused,
        fmt::format("cannot write {}: {}; nothing was changed", image.settingsFile(),
                    written.error ? written.error->description : "unknown reason"));
}

}  // namespace tools
