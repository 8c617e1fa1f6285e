#pragma once

#include <memory>
#include <string>
#include <string_view>

#include "deviceimage/Dataclass.h"
#include "deviceimage/DeviceImage.h"
#include "deviceimage/ImageLock.h"
#include "platform/Status.h"

namespace deviceimagetool {

using ImagePtr = std::shared_ptr<const deviceimage::DeviceImage>;

// The image at `path`, to be looked at. Refused when there is none.
ImagePtr openImage(const std::string& path);

// An image that this run alone may change until the lock goes.
struct LockedImage {
  ImagePtr image;
  std::unique_ptr<deviceimage::ImageLock> lock;
};
LockedImage openImageForWriting(const std::string& path);
LockedImage lockImage(ImagePtr image);

// The dataclass of that name: one that records are imported to and exported from.
deviceimage::Dataclass recordDataclassNamed(const std::string& name);

// Passes on a success; a failure of the image's databases ends the command. A change that failed
// has changed nothing.
void requireSuccess(const platform::Status& status, std::string_view whatFailed);

// One line on standard error: "device-image: " and the text, whose control characters are escaped.
void printMessage(std::string_view text);

}  // namespace deviceimagetool
