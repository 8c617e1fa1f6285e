#pragma once

#include "platform/AccountFramework.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Answers `statusKey`.
class InMemoryAccountFramework : public AccountFramework, public FakeService {
 public:
  std::string statusKey = "QuillnetStatus";

  std::string QuillnetStatusKey() override {
    return _fails("QuillnetStatusKey", {}) ? std::string() : statusKey;
  }
};

}  // namespace platform
