#pragma once

#include "platform/SystemLog.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingSystemLog : public SystemLog {
 public:
  explicit ForwardingSystemLog(SystemLog& next) : _next(next) {}

  void writeLine(std::string_view text) override { _next.writeLine(text); }

 private:
  SystemLog& _next;
};

}  // namespace platform
