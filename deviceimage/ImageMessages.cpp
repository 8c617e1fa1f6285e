#include "deviceimage/ImageMessages.h"

#include <unistd.h>

#include <utility>

namespace deviceimage {

ImageSystemLog::ImageSystemLog(std::shared_ptr<const DeviceImage> image, std::string processName,
                               Sink sink, bool writes)
    : _journal(std::move(image), DeviceImage::kSystemLogFile),
      _processName(std::move(processName)),
      _sink(std::move(sink)),
      _writes(writes) {}

void ImageSystemLog::writeLine(std::string_view text) {
  const std::string line = oneLine(text);
  if (_writes)
    _journal.append(timestamp() + " " + _processName + "[" + std::to_string(::getpid()) +
                    "]: " + line);
  if (_sink) _sink(line);
}

ImageNotifyCenter::ImageNotifyCenter(std::shared_ptr<const DeviceImage> image)
    : _journal(std::move(image), DeviceImage::kNotificationsFile) {}

void ImageNotifyCenter::postSystemNotification(std::string_view name) {
  _journal.append(jsonLine({{"time", timestamp()}, {"name", name}}));
}

}  // namespace deviceimage
