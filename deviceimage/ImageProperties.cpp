#include "deviceimage/ImageProperties.h"

namespace deviceimage {
namespace {

// In the order of the features.
constexpr std::array<std::string_view, 5> kKeys = {
    "CloudDocumentSync", "PhotoStream", "SharedPhotoStreams", "CloudBackup", "CardsWhileLocked"};

}  // namespace

std::optional<std::string> ImageDeviceInfo::queryValue(std::string_view key) {
  const auto value = _image->readProperty(DeviceImage::kDevicePropertiesFile, key);
  if (!value || value->asString() == nullptr) return std::nullopt;
  return *value->asString();
}

std::string ImageAccountFramework::QuillnetStatusKey() {
  return _deviceInfo.queryValue("QuillnetStatusKey").value_or("QuillnetStatus");
}

int ImageRestrictions::featureRestriction(platform::RestrictedFeature feature) {
  std::call_once(_isRead, [this] {
    const propertylist::FileReadResult read =
        _image->readPropertyList(DeviceImage::kRestrictionsFile);
    const propertylist::Dictionary* const states =
        read.value ? read.value->asDictionary() : nullptr;
    if (states == nullptr) return;
    for (std::size_t index = 0; index < kKeys.size(); ++index) {
      const propertylist::Value* const state = states->find(kKeys[index]);
      if (state != nullptr && state->asInteger() == kExplicitlyForbidden)
        _states[index] = kExplicitlyForbidden;
    }
  });
  return _states.at(static_cast<std::size_t>(feature));
}

}  // namespace deviceimage
