#pragma once

#include "platform/ProcessTable.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingProcessTable : public ProcessTable {
 public:
  explicit ForwardingProcessTable(ProcessTable& next) : _next(next) {}

  Sized sizeOfTable() override { return _next.sizeOfTable(); }
  Filled fillTable(std::size_t capacity) override { return _next.fillTable(capacity); }
  pid_t ownProcessIdentifier() override { return _next.ownProcessIdentifier(); }
  Status sendSignal(pid_t process, int signal) override {
    return _next.sendSignal(process, signal);
  }

 private:
  ProcessTable& _next;
};

}  // namespace platform
