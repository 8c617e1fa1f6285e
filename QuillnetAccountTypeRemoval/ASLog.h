#pragma once

#include <string_view>

#include "platform/SystemLog.h"

namespace accountsettings {

// Whether verbose tracing is on: the process's own default "ASLoggingEnabled", read at the first
// call and never again, also when it was absent. Turning it on or off takes effect in a new
// process.
bool getASLoggingEnabled();

// Writes a line of verbose tracing to the system log when tracing is on; else the arguments are not
// even described. Arguments that the format does not consume are accepted and not printed.
template <typename... Arguments>
void ASLog(std::string_view format, const Arguments&... arguments) {
  if (getASLoggingEnabled()) platform::logToSystem(format, arguments...);
}

}  // namespace accountsettings
