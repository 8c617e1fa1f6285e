#pragma once

#include <string>

#include "platform/Export.h"

namespace platform {

// What the device's account framework decides about service accounts.
class PLATFORM_EXPORT AccountFramework {
 public:
  virtual ~AccountFramework();
  // The account property under which a service account records its service status.
  virtual std::string QuillnetStatusKey() = 0;
};

}  // namespace platform
