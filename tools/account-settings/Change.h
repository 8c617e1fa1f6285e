#pragma once

#include <functional>

#include "tools/account-settings/AccountStore.h"
#include "tools/account-settings/Options.h"
#include "tools/common/ExitCode.h"

namespace tools {

// What every changing command does around its edit: takes the image's lock, reads the accounts, has
// `edit` change them in memory, saves them when anything changed, and looks whether the save
// succeeded. Refuses a settings file of which a save would lose something. A CommandFailure of the
// edit leaves the file as it is.
ExitCode changeAccounts(const ChangeOptions& options,
                        const std::function<void(AccountStore&)>& edit);

}  // namespace tools
