#pragma once

#include <mutex>
#include <string>
#include <vector>

#include "platform/SystemLog.h"

namespace platform {

// A system log that keeps its lines as they came.
class InMemorySystemLog : public SystemLog {
 public:
  void writeLine(std::string_view text) override {
    const std::lock_guard lock(_mutex);
    _lines.emplace_back(text);
  }
  std::vector<std::string> lines() const {
    const std::lock_guard lock(_mutex);
    return _lines;
  }
  void clear() {
    const std::lock_guard lock(_mutex);
    _lines.clear();
  }

 private:
  mutable std::mutex _mutex;
  std::vector<std::string> _lines;
};

}  // namespace platform
