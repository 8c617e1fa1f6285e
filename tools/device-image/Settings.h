#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "propertylist/Value.h"

namespace tools {

// The keys of the settings file and of its accounts that the tool reads or writes.
inline constexpr std::string_view kAccountsKey = "Accounts";
inline constexpr std::string_view kIdentifierKey = "Identifier";
inline constexpr std::string_view kTypeKey = "Type";
inline constexpr std::string_view kClassKey = "Class";
inline constexpr std::string_view kDisplayNameKey = "DisplayName";
inline constexpr std::string_view kUsernameKey = "Username";
inline constexpr std::string_view kAccountPathKey = "AccountPath";
inline constexpr std::string_view kEnabledDataclassesKey = "Enabled Dataclasses";
inline constexpr std::string_view kChildAccountsKey = "ChildAccounts";

// The account settings file of an image, as it was when it was read.
class Settings {
 public:
  // A missing file is one without accounts. One that is unreadable ends the command, since writing
  // it anew would lose what is in it.
  explicit Settings(const deviceimage::DeviceImage& image);

  // The top-level accounts, in the order of the file. An entry that is no dictionary is left out.
  std::vector<propertylist::Dictionary> accounts() const;
  // The top-level account with that identifier.
  std::optional<propertylist::Dictionary> findAccount(std::string_view identifier) const;
  // Whether an account or a child account has the identifier.
  bool usesIdentifier(std::string_view identifier) const;

  // Appends the account, and replaces the file. Everything else in it stays.
  void addAccount(const deviceimage::DeviceImage& image, const propertylist::Dictionary& account);

 private:
  propertylist::Dictionary _root;
};

// The dictionaries in the array under `key`; anything else in it is left out.
std::vector<propertylist::Dictionary> dictionariesIn(const propertylist::Dictionary& dictionary,
                                                     std::string_view key);

// The string under `key`, or an empty one.
std::string stringOrEmpty(const propertylist::Dictionary& dictionary, std::string_view key);

}  // namespace tools
