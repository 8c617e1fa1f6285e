#pragma once

#include <map>
#include <string>
#include <utility>

#include "platform/DeviceInfo.h"
#include "platform/testing/FakeService.h"

namespace platform {

// A device with the properties that a test gives it.
class InMemoryDeviceInfo : public DeviceInfo, public FakeService {
 public:
  explicit InMemoryDeviceInfo(std::string root = "/") : systemRoot(std::move(root)) {}
  std::map<std::string, std::string, std::less<>> properties;
  std::string systemRoot;

  std::optional<std::string> queryValue(std::string_view key) override {
    if (_fails("queryValue", {key})) return std::nullopt;
    const auto found = properties.find(key);
    if (found == properties.end()) return std::nullopt;
    return found->second;
  }
  std::string systemRootDirectory() override {
    _received("systemRootDirectory", {});
    return systemRoot;
  }
};

}  // namespace platform
