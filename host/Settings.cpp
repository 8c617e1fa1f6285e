#include "host/Settings.h"

#include <fcntl.h>

#include <algorithm>
#include <cmath>
#include <limits>

#include "deviceimage/Descriptor.h"
#include "propertylist/Writing.h"

namespace host {
namespace {

using propertylist::Dictionary;
using propertylist::Value;

constexpr std::int64_t kLargest = std::numeric_limits<std::int64_t>::max();
constexpr std::int64_t kSmallest = std::numeric_limits<std::int64_t>::min();

std::int64_t truncated(double real) {
  if (std::isnan(real)) return 0;
  if (real >= static_cast<double>(kLargest)) return kLargest;
  if (real <= static_cast<double>(kSmallest)) return kSmallest;
  return static_cast<std::int64_t>(real);
}

std::int64_t leadingInteger(std::string_view text) {
  const std::size_t start = text.find_first_not_of(" \t\n\v\f\r");
  if (start == std::string_view::npos) return 0;
  text.remove_prefix(start);
  const bool negative = text.starts_with('-');
  if (negative || text.starts_with('+')) text.remove_prefix(1);
  std::int64_t number = 0;  // kept negative, where there is room for one more
  for (const char digit : text) {
    if (digit < '0' || digit > '9') break;
    if (__builtin_mul_overflow(number, 10, &number) ||
        __builtin_sub_overflow(number, digit - '0', &number))
      return negative ? kSmallest : kLargest;
  }
  if (negative) return number;
  return number == kSmallest ? kLargest : -number;
}

}  // namespace

Settings readSettings(const deviceimage::DeviceImage& image) {
  Settings settings;
  // Before it is read: a file that replaces it in between counts as another one then.
  const deviceimage::Descriptor file(
      image.openFile(deviceimage::DeviceImage::kSettingsFile, O_RDONLY).descriptor);
  if (file.isOpen() && fstat(file.number(), &settings.file) != 0) settings.file = {};
  const auto read = image.readPropertyList(deviceimage::DeviceImage::kSettingsFile);
  settings.exists = read.exists;
  const Dictionary* root = read.value ? read.value->asDictionary() : nullptr;
  if (root == nullptr) {
    if (read.exists) settings.error = read.value ? "it holds no dictionary" : read.error;
    return settings;
  }
  const Value* version = root->find("Version");
  if (version != nullptr) settings.version = version->asInteger();
  const propertylist::Array* accounts = propertylist::findArray(*root, "Accounts");
  if (accounts == nullptr) return settings;
  for (const Value& entry : *accounts) {
    if (const Dictionary* account = entry.asDictionary())
      settings.accounts.push_back(*account);
    else
      ++settings.strangeEntries;
  }
  return settings;
}

bool isSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino && a.st_size == b.st_size &&
         a.st_ctim.tv_sec == b.st_ctim.tv_sec && a.st_ctim.tv_nsec == b.st_ctim.tv_nsec;
}

std::string_view textUnder(const Dictionary& account, std::string_view key) {
  const propertylist::Text* text = propertylist::findString(account, key);
  return text != nullptr ? std::string_view(*text) : std::string_view();
}

std::string nameUnder(const Dictionary& account, std::string_view key) {
  constexpr std::size_t kLongestName = 1024;
  const propertylist::Text* text = propertylist::findString(account, key);
  return text != nullptr ? propertylist::shortened(*text, kLongestName) : std::string();
}

std::int64_t integerValue(const Value* value) {
  if (value == nullptr) return 0;
  if (const auto integer = value->asInteger()) return *integer;
  if (value->asUnsigned()) return kLargest;
  if (const auto boolean = value->asBoolean()) return *boolean ? 1 : 0;
  if (const auto real = value->asReal()) return truncated(*real);
  if (const propertylist::Text* text = value->asString()) return leadingInteger(*text);
  return 0;
}

bool Selection::covers(const Dictionary& account) const {
  return SelectedAccounts(*this).cover(account);
}

bool SelectedAccounts::cover(const Dictionary& account) {
  const std::string_view type = typeOf(account);
  return std::any_of(
      _selection.rules.begin(), _selection.rules.end(), [&](const Selection::Rule& rule) {
        return std::find(rule.types.begin(), rule.types.end(), type) != rule.types.end() &&
               _statusOf(account) == rule.status;
      });
}

std::int64_t SelectedAccounts::_statusOf(const Dictionary& account) {
  constexpr std::size_t kShort = 64;
  const Value* const status = account.find(_selection.statusKey);
  const propertylist::Text* const text = status != nullptr ? status->asString() : nullptr;
  if (text == nullptr || text->size() <= kShort) return integerValue(status);
  const auto known = _numbers.find(text->data());
  if (known != _numbers.end()) return known->second;
  return _numbers.emplace(text->data(), leadingInteger(*text)).first->second;
}

bool UnkeepableAccounts::covers(const Dictionary& account) const {
  const auto holds = [](const std::vector<std::string>& list, std::string_view text) {
    return std::find(list.begin(), list.end(), text) != list.end();
  };
  if (!holds(types, typeOf(account)) || holds(knownClasses, textUnder(account, "Class")))
    return false;
  const std::string_view path = textUnder(account, "AccountPath");
  return std::none_of(knownPathParts.begin(), knownPathParts.end(), [&](const std::string& part) {
    return path.find(part) != std::string::npos;
  });
}

}  // namespace host
