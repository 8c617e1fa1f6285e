#pragma once

#include "platform/SystemNotifyCenter.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingNotifyCenter : public SystemNotifyCenter {
 public:
  explicit ForwardingNotifyCenter(SystemNotifyCenter& next) : _next(next) {}

  void postSystemNotification(std::string_view name) override {
    _next.postSystemNotification(name);
  }

 private:
  SystemNotifyCenter& _next;
};

}  // namespace platform
