#pragma once

#include "platform/AccountFramework.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingAccountFramework : public AccountFramework {
 public:
  explicit ForwardingAccountFramework(AccountFramework& next) : _next(next) {}

  std::string QuillnetStatusKey() override { return _next.QuillnetStatusKey(); }

 private:
  AccountFramework& _next;
};

}  // namespace platform
