#pragma once

#include <functional>
#include <string>

#include "tools/account-settings/AccountStore.h"
#include "tools/account-settings/Options.h"
#include "tools/common/ExitCode.h"

namespace tools {

// Changes the accounts in memory.
using Edit = std::function<void(AccountStore&)>;
// Takes back what an edit did to the image outside the settings file. Returns what to add to the
// message of the failure: "; ..." or nothing.
using TakeBack = std::function<std::string()>;

// What every changing command does around its edit: takes the image's lock, reads the accounts, has
// `edit` change them in memory, saves them when anything changed, and looks whether the save
// succeeded. Refuses a settings file of which a save would lose something. A CommandFailure of the
// edit leaves the file as it is; after one, and when the save fails, `takeBack` runs.
ExitCode changeAccounts(const ChangeOptions& options, const Edit& edit,
                        const TakeBack& takeBack = nullptr);

}  // namespace tools
