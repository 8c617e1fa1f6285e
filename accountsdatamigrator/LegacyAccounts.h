#pragma once

#include <optional>
#include <string>

#include "accountsdatamigrator/AccountTypes.h"
#include "propertylist/Value.h"

namespace accountsdatamigrator {

// The accounts of the legacy files (docs/legacy-settings.md has their form) as accounts of a
// settings file: those of the mail accounts file first, each list in its order. A path that is
// empty stands for a file that is not there.
//
// Equal files give equal accounts, identifiers included. An entry of which no account can be made,
// and a dataclass that its type cannot have, is left out with a line in the system log that names
// its place. Empty, after a line in the log, when a file that is there cannot be read or its list
// of accounts is no list: then nothing may be written, since what was built would look whole.
std::optional<propertylist::Array> readLegacyAccounts(const std::string& mailAccountsFile,
                                                      const std::string& dataAccessFile,
                                                      const AccountTypes& types);

}  // namespace accountsdatamigrator
