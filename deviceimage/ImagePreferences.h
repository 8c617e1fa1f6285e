#pragma once

#include <memory>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/Journal.h"
#include "platform/PreferencesService.h"

namespace deviceimage {

// Preferences as property lists: an application's in var/mobile/Library/Preferences, the process's
// own defaults in DeviceImage::kProcessDefaultsFile. Each question reads the file anew. Changes
// that are posted become lines of var/log/preference-changes.jsonl: {"time": ..., "application":
// ..., "key": ...}.
class ImagePreferences : public platform::PreferencesService {
 public:
  explicit ImagePreferences(std::shared_ptr<const DeviceImage> image);
  std::optional<propertylist::Value> readDefault(std::string_view key) override;
  std::optional<propertylist::Value> readApplicationPreference(std::string_view application,
                                                               std::string_view key) override;
  void postPreferencesChanged(std::string_view application, std::string_view key) override;

 private:
  std::shared_ptr<const DeviceImage> _image;
  Journal _journal;
};

}  // namespace deviceimage
