#pragma once

#include <string_view>

#include "platform/Export.h"

namespace platform {

// Notifications that every process of the device can hear.
class PLATFORM_EXPORT SystemNotifyCenter {
 public:
  virtual ~SystemNotifyCenter();
  // Posts the notification `name`, with no object and no payload, in its turn in the queue.
  virtual void postSystemNotification(std::string_view name) = 0;
};

}  // namespace platform
