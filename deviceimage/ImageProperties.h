#pragma once

#include <array>
#include <memory>
#include <mutex>
#include <utility>

#include "deviceimage/DeviceImage.h"
#include "platform/AccountFramework.h"
#include "platform/DeviceInfo.h"
#include "platform/RestrictionsService.h"
#include "platform/UserDatabase.h"

// What the files of an image say about the device. Each question reads the file anew, but for the
// restrictions.
namespace deviceimage {

// The strings of the property list System/Library/DeviceProperties.plist.
class ImageDeviceInfo : public platform::DeviceInfo {
 public:
  explicit ImageDeviceInfo(std::shared_ptr<const DeviceImage> image) : _image(std::move(image)) {}
  std::optional<std::string> queryValue(std::string_view key) override;
  std::string systemRootDirectory() override { return _image->rootPath(); }

 private:
  std::shared_ptr<const DeviceImage> _image;
};

// The device property "QuillnetStatusKey", else "QuillnetStatus".
class ImageAccountFramework : public platform::AccountFramework {
 public:
  explicit ImageAccountFramework(std::shared_ptr<const DeviceImage> image)
      : _deviceInfo(std::move(image)) {}
  std::string QuillnetStatusKey() override;

 private:
  ImageDeviceInfo _deviceInfo;
};

// The integers of the property list DeviceImage::kRestrictionsFile, under "CloudDocumentSync",
// "PhotoStream", "SharedPhotoStreams", "CloudBackup" and "CardsWhileLocked". 2 forbids the feature;
// a feature that is not named there is not restricted (0). The file is read for the first question
// and then no more: the account settings library asks five times for each account of each load and
// each save, and nobody changes a profile of an image while a program works on it.
class ImageRestrictions : public platform::RestrictionsService {
 public:
  explicit ImageRestrictions(std::shared_ptr<const DeviceImage> image) : _image(std::move(image)) {}
  int featureRestriction(platform::RestrictedFeature feature) override;

 private:
  static constexpr std::size_t kFeatureCount = 5;
  std::shared_ptr<const DeviceImage> _image;
  std::once_flag _isRead;
  std::array<int, kFeatureCount> _states{};  // by feature, in the order of their keys
};

// The image's own etc/passwd and etc/group.
class ImageUserDatabase : public platform::UserDatabase {
 public:
  explicit ImageUserDatabase(std::shared_ptr<const DeviceImage> image) : _image(std::move(image)) {}
  std::optional<uid_t> userIdentifierForName(std::string_view name) override {
    return _image->userNumber(name);
  }
  std::optional<gid_t> groupIdentifierForName(std::string_view name) override {
    return _image->groupNumber(name);
  }
  std::string homeDirectory() override { return _image->homeDirectory(); }

 private:
  std::shared_ptr<const DeviceImage> _image;
};

}  // namespace deviceimage
