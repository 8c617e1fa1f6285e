#pragma once

#include <array>
#include <cstdio>

#include "platform/UUIDGenerator.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Counts: 00000000-0000-4000-8000-000000000001 comes first.
class InMemoryUUIDGenerator : public UUIDGenerator, public FakeService {
 public:
  std::optional<std::string> generateUUID() override {
    if (_fails("generateUUID", {})) return std::nullopt;
    std::array<char, 37> text = {};
    std::snprintf(text.data(), text.size(), "00000000-0000-4000-8000-%012llX", ++_made);
    return text.data();
  }

 private:
  unsigned long long _made = 0;
};

}  // namespace platform
