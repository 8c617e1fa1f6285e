#pragma once

#include <cstddef>
#include <string>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "propertylist/Value.h"

namespace bench {

// Changes one account in a hundred in memory, at least one.
void changeSome(accountsettings::ASSAccountsManager& store);

// The settings as another process has left them meanwhile: others of the accounts, one in a
// hundred, have another value on disk.
propertylist::Bytes changedElsewhere(std::size_t accounts);

// Writes the bytes to a real file; throws std::runtime_error when that fails.
void writeFile(const std::string& path, const propertylist::Bytes& bytes);

// Whether the file at `path` has what changeSome changed: a save answers nothing itself.
bool holdsChanges(const std::string& path);

}  // namespace bench
