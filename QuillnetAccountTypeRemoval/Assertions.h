#pragma once

#include <string>
#include <string_view>

#include "platform/InternalConsistencyFailure.h"
#include "platform/LogFormat.h"

namespace accountsettings {

// Raises platform::InternalConsistencyFailure with `format` expanded as for a log line.
template <typename... Arguments>
[[noreturn]] void raiseAssertionFailure(std::string_view sourceFile, int line,
                                        std::string_view format, const Arguments&... arguments) {
  throw platform::InternalConsistencyFailure(
      platform::formatLogLine(format, {platform::LogArgument(arguments)...}),
      std::string(sourceFile), line);
}

}  // namespace accountsettings
