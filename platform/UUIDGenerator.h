#pragma once

#include <optional>
#include <string>

#include "platform/Export.h"

namespace platform {

// Makes universally unique identifiers. Any thread.
class PLATFORM_EXPORT UUIDGenerator {
 public:
  virtual ~UUIDGenerator();
  // A fresh identifier as five groups of 8, 4, 4, 4 and 12 upper-case hexadecimal digits joined by
  // "-"; empty when none can be made.
  virtual std::optional<std::string> generateUUID() = 0;
};

}  // namespace platform
