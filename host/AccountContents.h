#pragma once

#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "propertylist/Value.h"

namespace host {

// Tells accounts apart by what they hold. What many accounts share, in a small file maybe very many
// a long text, is looked at once.
class AccountContents {
 public:
  static constexpr std::string_view kNone = "none";
  // The keys are not looked at. `ignoredKeys` outlives the object, and so does every account.
  explicit AccountContents(const std::vector<std::string>& ignoredKeys)
      : _ignoredKeys(ignoredKeys) {}

  // The same text for accounts that are equal apart from the ignored keys, and for no others; but
  // kNone for all that no file can hold when what they share is written out.
  std::string of(const propertylist::Dictionary& account);

 private:
  propertylist::Value _short(const propertylist::Value& value);
  propertylist::Value _shortContainer(const propertylist::Value& container);
  std::string _shortText(std::string_view text);

  const std::vector<std::string>& _ignoredKeys;
  // By where they lie in memory.
  std::unordered_map<const void*, std::string> _contents;           // of accounts
  std::unordered_map<const void*, propertylist::Value> _shortened;  // containers
  std::unordered_map<const void*, std::string> _hashes;             // of long texts and data
};

}  // namespace host
