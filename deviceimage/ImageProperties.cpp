#include "deviceimage/ImageProperties.h"

namespace deviceimage {
namespace {

std::string_view keyOf(platform::RestrictedFeature feature) {
  switch (feature) {
    case platform::RestrictedFeature::cloudDocumentSync:
      return "CloudDocumentSync";
    case platform::RestrictedFeature::photoStream:
      return "PhotoStream";
    case platform::RestrictedFeature::sharedPhotoStreams:
      return "SharedPhotoStreams";
    case platform::RestrictedFeature::cloudBackup:
      return "CloudBackup";
    case platform::RestrictedFeature::cardsWhileLocked:
      break;
  }
  return "CardsWhileLocked";
}

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
  const auto value = _image->readProperty(DeviceImage::kRestrictionsFile, keyOf(feature));
  const std::optional<std::int64_t> state = value ? value->asInteger() : std::nullopt;
  return state == kExplicitlyForbidden ? kExplicitlyForbidden : 0;
}

}  // namespace deviceimage
