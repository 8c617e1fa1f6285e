#pragma once

#include "platform/UUIDGenerator.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingUUIDGenerator : public UUIDGenerator {
 public:
  explicit ForwardingUUIDGenerator(UUIDGenerator& next) : _next(next) {}

  std::optional<std::string> generateUUID() override { return _next.generateUUID(); }

 private:
  UUIDGenerator& _next;
};

}  // namespace platform
