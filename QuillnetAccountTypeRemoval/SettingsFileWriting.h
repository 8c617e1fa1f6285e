#pragma once

#include <string>

#include "propertylist/Value.h"

namespace accountsettings {

// Writes `root` as a binary property list over the file at `target`, owned by the account "mobile"
// and private to it. The bytes go to a temporary file that is complete and on the disk before it is
// renamed over the target, so a reader and a power cut meet the old or the new file, never a part.
// False when anything failed, memory that ran out included: what is at the target is then what was
// there, byte for byte, and no temporary file is left.
//   setAsideFirst  keep what is at `target` under another name before it is replaced, and fail if
//                  that cannot be done: it holds settings that could not be read. When a later step
//                  fails it stays kept, with what setAsideUnreadableFile changes of its mode and
//                  names
bool writeSettingsFile(const propertylist::Dictionary& root, const std::string& target,
                       bool setAsideFirst);

}  // namespace accountsettings
