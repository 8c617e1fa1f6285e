#pragma once

#include <functional>
#include <string>
#include <vector>

#include "platform/SystemNotifyCenter.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Keeps the names that were posted, and tells a test's listener.
class InMemoryNotifyCenter : public SystemNotifyCenter, public FakeService {
 public:
  std::vector<std::string> posted;
  std::function<void(std::string_view name)> listener;

  void postSystemNotification(std::string_view name) override {
    if (_fails("postSystemNotification", {name})) return;
    posted.emplace_back(name);
    if (listener) listener(name);
  }
};

}  // namespace platform
