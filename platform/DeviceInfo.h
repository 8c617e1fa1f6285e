#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/Export.h"

namespace platform {

// The device's fixed properties. Any thread.
class PLATFORM_EXPORT DeviceInfo {
 public:
  virtual ~DeviceInfo();
  // The property under `key` ("CPUArchitecture", "DeviceClass"); empty when the device has none.
  virtual std::optional<std::string> queryValue(std::string_view key) = 0;
  // The directory under which the device's files lie: "/" on a device.
  virtual std::string systemRootDirectory() = 0;
};

// `root` with `path` below it, one "/" between the two ("/" and "/a" give "/a"). The result never
// leads above `root`, also when `path` begins with "/": "." and ".." in `path` are resolved by
// their text, and a ".." that would leave `root` is dropped. Links are not looked at.
PLATFORM_EXPORT std::string joinedPath(std::string_view root, std::string_view path);

}  // namespace platform
