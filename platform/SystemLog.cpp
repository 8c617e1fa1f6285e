#include "platform/SystemLog.h"

#include "platform/Services.h"

namespace platform {

void writeSystemLog(std::string_view format, std::initializer_list<LogArgument> arguments) {
  services().systemLog.writeLine(formatLogLine(format, arguments, kLongestLogArgument));
}

}  // namespace platform
