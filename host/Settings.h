#pragma once

#include <sys/stat.h>

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "propertylist/Value.h"

namespace host {

// The account settings of an image, as the host looks at them: read only, and top-level accounts
// only.
struct Settings {
  bool exists = false;
  std::string error;  // why an existing file cannot be read as a dictionary; empty when it can
  std::vector<propertylist::Dictionary> accounts;  // in file order
  std::size_t strangeEntries = 0;                  // entries of "Accounts" that are no dictionary
  std::optional<std::int64_t> version;             // the integer under "Version"
  struct stat file = {};                           // of an existing regular file
};
Settings readSettings(const deviceimage::DeviceImage& image);

// The version that programs write now.
inline constexpr std::int64_t kPresentVersion = 12;

// Whether both tell of one file that nobody has written or replaced in between.
bool isSameFile(const struct stat& a, const struct stat& b);

// The text under `key`, which belongs to the account; empty without one.
std::string_view textUnder(const propertylist::Dictionary& account, std::string_view key);
// The same for reports and people, shortened to 1,024 bytes: of a small file very many accounts may
// share a text of megabytes.
std::string nameUnder(const propertylist::Dictionary& account, std::string_view key);
inline std::string_view typeOf(const propertylist::Dictionary& account) {
  return textUnder(account, "Type");
}

// The number that the device's account framework reads from a property: an integer itself, a
// boolean 1 or 0, a real without its fraction, a string by its leading blanks, sign and digits;
// else 0. What is beyond 64 bits counts as the nearest number there is.
std::int64_t integerValue(const propertylist::Value* value);

// Which accounts a run of migrators is to retire.
struct Selection {
  std::string statusKey;  // the account framework's
  struct Rule {
    std::vector<std::string> types;
    std::int64_t status = 0;
  };
  std::vector<Rule> rules;  // one a migrator
  bool covers(const propertylist::Dictionary& account) const;
};

// The same for many accounts: a long status that they share is read once.
class SelectedAccounts {
 public:
  // `selection` and the accounts outlive the object.
  explicit SelectedAccounts(const Selection& selection) : _selection(selection) {}
  bool cover(const propertylist::Dictionary& account);

 private:
  std::int64_t _statusOf(const propertylist::Dictionary& account);
  const Selection& _selection;
  std::unordered_map<const char*, std::int64_t> _numbers;  // of texts, by where they lie
};

// Accounts that a migrator cannot keep, although it is not to retire them: those of the types whose
// class is none of the known ones, unless a known class can be told from a part of the path in
// their "AccountPath".
struct UnkeepableAccounts {
  std::vector<std::string> types;
  std::vector<std::string> knownClasses;
  std::vector<std::string> knownPathParts;
  bool covers(const propertylist::Dictionary& account) const;
};

}  // namespace host
