#pragma once

#include <functional>
#include <memory>
#include <string>
#include <string_view>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/Journal.h"
#include "platform/SystemLog.h"
#include "platform/SystemNotifyCenter.h"

namespace deviceimage {

// The system log: var/log/system.log in the image, with lines such as
// "2026-11-21T03:04:05Z migration-host[123]: text", where control characters of the text are
// escaped.
class ImageSystemLog : public platform::SystemLog {
 public:
  using Sink = std::function<void(std::string_view line)>;
  // `sink` may be empty; it gets the escaped text alone. Without `writes` it alone gets the lines.
  ImageSystemLog(std::shared_ptr<const DeviceImage> image, std::string processName, Sink sink,
                 bool writes = true);
  void writeLine(std::string_view text) override;

 private:
  Journal _journal;
  std::string _processName;
  Sink _sink;
  bool _writes;
};

// Notifications, as lines of var/log/notifications.jsonl: {"time": ..., "name": ...}. Nobody on an
// image listens; whoever looks at the image sees what was posted.
class ImageNotifyCenter : public platform::SystemNotifyCenter {
 public:
  explicit ImageNotifyCenter(std::shared_ptr<const DeviceImage> image);
  void postSystemNotification(std::string_view name) override;

 private:
  Journal _journal;
};

}  // namespace deviceimage
