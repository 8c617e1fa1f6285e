#pragma once

#include <memory>
#include <string>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/ImageLock.h"

namespace tools {

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

}  // namespace tools
