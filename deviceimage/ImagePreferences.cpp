#include "deviceimage/ImagePreferences.h"

#include <utility>

namespace deviceimage {

ImagePreferences::ImagePreferences(std::shared_ptr<const DeviceImage> image)
    : _image(image), _journal(std::move(image), DeviceImage::kPreferenceChangesFile) {}

std::optional<propertylist::Value> ImagePreferences::readDefault(std::string_view key) {
  return _image->readProperty(DeviceImage::kProcessDefaultsFile, key);
}

std::optional<propertylist::Value> ImagePreferences::readApplicationPreference(
    std::string_view application, std::string_view key) {
  const std::optional<std::string> file = DeviceImage::preferencesFile(application);
  if (!file) return std::nullopt;
  return _image->readProperty(*file, key);
}

void ImagePreferences::postPreferencesChanged(std::string_view application, std::string_view key) {
  _journal.append(jsonLine({{"time", timestamp()}, {"application", application}, {"key", key}}));
}

}  // namespace deviceimage
