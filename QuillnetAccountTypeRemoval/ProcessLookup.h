#pragma once

#include <sys/types.h>

namespace accountsettings {

// The identifier of the first process, in the order of the process table, whose command name equals
// `name` over the first 16 bytes: longer names that begin alike are one to the kernel. -1 when
// there is none; a failed query of the table gives its own code where that is negative, and -1
// where it is not, since callers take any other number for a process.
pid_t findProcessIDByName(const char* name);

}  // namespace accountsettings
