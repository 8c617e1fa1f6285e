#pragma once

#include <cstddef>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "propertylist/Value.h"

namespace bench {

// Changes one account in a hundred in memory, at least one.
void changeSome(accountsettings::ASSAccountsManager& store);

// The settings as another process has left them meanwhile: others of the accounts, one in a
// hundred, have another value on disk.
propertylist::Bytes changedElsewhere(std::size_t accounts);

}  // namespace bench
