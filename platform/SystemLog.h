#pragma once

#include <cstddef>
#include <string_view>

#include "platform/Export.h"
#include "platform/LogFormat.h"

namespace platform {

// The device's system log.
class PLATFORM_EXPORT SystemLog {
 public:
  virtual ~SystemLog();
  // Writes one line. `text` is already expanded; the log adds its own prefix (time, process) and
  // the line end, and must keep one call one line: a line break inside `text` may not start a
  // second entry. Never fails towards the caller. Any thread.
  virtual void writeLine(std::string_view text) = 0;
};

// Expands `format` with `arguments` and writes the line to the installed system log. Of an argument
// with a longer text than kLongestLogArgument bytes that much is written, and "...": a small
// settings file can name one large value very often, and each place may get a line.
inline constexpr std::size_t kLongestLogArgument = 1024;
PLATFORM_EXPORT void writeSystemLog(std::string_view format,
                                    std::initializer_list<LogArgument> arguments);
template <typename... Arguments>
void logToSystem(std::string_view format, const Arguments&... arguments) {
  writeSystemLog(format, {LogArgument(arguments)...});
}

}  // namespace platform
