#pragma once

#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <string_view>

#include "propertylist/Value.h"

namespace accountsdatamigrator {

// The identifiers of the accounts that one migration makes. No two are equal.
class LegacyIdentifiers {
 public:
  // Takes `own` for an account; false when an earlier account has it.
  bool take(std::string_view own) {
    return !_taken.contains(own) && _taken.emplace(own).second;  // one that is taken is not copied
  }

  // An identifier that follows from the entry's content: equal entries in the same order get equal
  // ones each time, and entries with equal content differ by their order. What is nested in the
  // entry counts for nothing, and of a long value its beginning, so that many entries that share
  // one large value cost no more than as many small ones.
  std::string make(const propertylist::Dictionary& entry);

 private:
  std::set<std::string, std::less<>> _taken;
  // By the first identifier that a content gives: how many others were tried for it.
  std::map<std::string, std::uint32_t> _tries;
};

}  // namespace accountsdatamigrator
