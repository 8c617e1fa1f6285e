#pragma once

#include "platform/DeviceInfo.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingDeviceInfo : public DeviceInfo {
 public:
  explicit ForwardingDeviceInfo(DeviceInfo& next) : _next(next) {}

  std::optional<std::string> queryValue(std::string_view key) override {
    return _next.queryValue(key);
  }
  std::string systemRootDirectory() override { return _next.systemRootDirectory(); }

 private:
  DeviceInfo& _next;
};

}  // namespace platform
