#pragma once

#include <optional>
#include <string_view>

#include "platform/Export.h"
#include "propertylist/Value.h"

namespace platform {

// User preferences. What cannot be read counts as absent.
class PLATFORM_EXPORT PreferencesService {
 public:
  virtual ~PreferencesService();
  // The value under `key` in the running process's own defaults.
  virtual std::optional<propertylist::Value> readDefault(std::string_view key) = 0;
  // The value under `key` in the preferences of another application.
  virtual std::optional<propertylist::Value> readApplicationPreference(std::string_view application,
                                                                       std::string_view key) = 0;
  // Tells everybody who listens that the application's preference under `key` has changed.
  virtual void postPreferencesChanged(std::string_view application, std::string_view key) = 0;
};

}  // namespace platform
