#pragma once

#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

#include "propertylist/Value.h"

namespace tools {

// One thing that a command changed about the accounts.
struct Difference {
  enum class Kind { added, deleted, modified };
  Kind kind = Kind::modified;
  std::string account;  // its identifier
  std::string parent;   // the parent's identifier, of a child account
  std::string key;      // the property, when the account was modified
  // The property's value; of an account that was added or deleted, its properties.
  std::optional<propertylist::Value> before, after;
};

// What differs between two states of the top-level accounts, children included. Accounts are
// matched by their identifiers; their order does not
// count, but the differences are in that of the accounts, deleted ones first.
std::vector<Difference> differencesBetween(const std::vector<propertylist::Dictionary>& before,
                                           const std::vector<propertylist::Dictionary>& after);

// One line without a line end: "Q1: Port: 993 -> 995".
std::string describe(const Difference& difference);
nlohmann::json jsonOf(const Difference& difference);

}  // namespace tools
