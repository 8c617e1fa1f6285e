#pragma once

#include <string>
#include <vector>

#include "host/Report.h"
#include "host/Settings.h"

namespace host {

// What became of the top-level accounts between two looks at the settings.
struct AccountComparison {
  std::vector<AccountReport> accounts;      // one for each account of before, in file order
  std::vector<std::string> leftBehind;      // sentences: accounts kept or dropped
  std::vector<std::string> contradictions;  // sentences: accounts changed that must not have been
};

// An account is found again by its identifier; one without is found by everything else it holds,
// since the first save gives it an identifier. An account that is not to be retired must keep its
// keys, values and place; only what lies under `correctedKeys` may change or come new.
AccountComparison compareAccounts(const std::vector<propertylist::Dictionary>& before,
                                  const std::vector<propertylist::Dictionary>& after,
                                  const Selection& selection,
                                  const std::vector<std::string>& correctedKeys);

}  // namespace host
