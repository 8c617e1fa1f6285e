#pragma once

#include "platform/UUIDGenerator.h"

namespace platform {

// Random identifiers (version 4) from the kernel's generator.
class PLATFORM_EXPORT RandomUUIDGenerator : public UUIDGenerator {
 public:
  // Empty when the kernel gives no random bytes.
  std::optional<std::string> generateUUID() override;
};

}  // namespace platform
