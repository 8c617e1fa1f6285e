#pragma once

#include <map>
#include <string>
#include <utility>
#include <vector>

#include "platform/PreferencesService.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Preferences as a test fills them.
class InMemoryPreferences : public PreferencesService, public FakeService {
 public:
  propertylist::Dictionary defaults;                                          // the process's own
  std::map<std::string, propertylist::Dictionary, std::less<>> applications;  // the others'
  std::vector<std::pair<std::string, std::string>> posted;  // changes: application and key

  std::optional<propertylist::Value> readDefault(std::string_view key) override {
    if (_fails("readDefault", {key})) return std::nullopt;
    return _valueIn(defaults, key);
  }
  std::optional<propertylist::Value> readApplicationPreference(std::string_view application,
                                                               std::string_view key) override {
    if (_fails("readApplicationPreference", {application, key})) return std::nullopt;
    const auto found = applications.find(application);
    if (found == applications.end()) return std::nullopt;
    return _valueIn(found->second, key);
  }
  void postPreferencesChanged(std::string_view application, std::string_view key) override {
    if (!_fails("postPreferencesChanged", {application, key}))
      posted.emplace_back(application, key);
  }

 private:
  static std::optional<propertylist::Value> _valueIn(const propertylist::Dictionary& dictionary,
                                                     std::string_view key) {
    const propertylist::Value* value = dictionary.find(key);
    if (value == nullptr) return std::nullopt;
    return *value;
  }
};

}  // namespace platform
