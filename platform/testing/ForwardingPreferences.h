#pragma once

#include "platform/PreferencesService.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingPreferences : public PreferencesService {
 public:
  explicit ForwardingPreferences(PreferencesService& next) : _next(next) {}

  std::optional<propertylist::Value> readDefault(std::string_view key) override {
    return _next.readDefault(key);
  }
  std::optional<propertylist::Value> readApplicationPreference(std::string_view application,
                                                               std::string_view key) override {
    return _next.readApplicationPreference(application, key);
  }
  void postPreferencesChanged(std::string_view application, std::string_view key) override {
    _next.postPreferencesChanged(application, key);
  }

 private:
  PreferencesService& _next;
};

}  // namespace platform
