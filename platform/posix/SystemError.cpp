#include "platform/posix/SystemError.h"

#include <system_error>

namespace platform {

Status systemFailure(int code, const std::string& what, const std::string& path) {
  return Status::failure(code, "cannot " + what + (path.empty() ? "" : " " + path) + ": " +
                                   std::generic_category().message(code));
}

}  // namespace platform
