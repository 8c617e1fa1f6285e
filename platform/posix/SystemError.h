#pragma once

#include <string>

#include "platform/Status.h"

namespace platform {

// The failure with errno `code` of doing `what` ("create") to `path`.
Status systemFailure(int code, const std::string& what, const std::string& path = {});

}  // namespace platform
