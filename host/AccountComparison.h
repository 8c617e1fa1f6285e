#pragma once

#include <string>
#include <vector>

#include "host/Report.h"
#include "host/Settings.h"

namespace host {

// What migrators may do to accounts that are not to be retired.
struct AccountRights {
  std::vector<std::string> correctedKeys;        // what lies under them may change or come new
  std::vector<UnkeepableAccounts> mayBeDropped;  // accounts that may go
  std::vector<std::string> mayBeAdded;           // types of which the first account may come
};

// What became of the top-level accounts between two looks at the settings.
struct AccountComparison {
  std::vector<AccountReport> accounts;      // one for each account of before, in file order
  std::vector<std::string> leftBehind;      // sentences: accounts kept, or dropped as they may be
  std::vector<std::string> contradictions;  // sentences: what must not have happened to accounts
};

// An account is found again by its identifier; one without is found by everything else it holds,
// since the first save gives it an identifier. An account that is not to be retired must keep its
// keys, values and place, and none may go or come, apart from what the rights allow.
AccountComparison compareAccounts(const std::vector<propertylist::Dictionary>& before,
                                  const std::vector<propertylist::Dictionary>& after,
                                  const Selection& selection, const AccountRights& rights);

}  // namespace host
