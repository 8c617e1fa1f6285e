#include "tools/common/Images.h"

#include <utility>

#include "tools/common/ExitCode.h"

namespace tools {

using deviceimage::ImageLock;

ImagePtr openImage(const std::string& path) {
  deviceimage::OpenedImage opened = deviceimage::DeviceImage::open(path);
  if (!opened.image) throw CommandFailure(ExitCode::refused, opened.error);
  return std::move(opened.image);
}

LockedImage lockImage(ImagePtr image) {
  ImageLock::Attempt attempt = ImageLock::tryAcquire(*image);
  if (attempt.outcome == ImageLock::Outcome::heldByAnother)
    throw CommandFailure(ExitCode::heldByAnotherRun, attempt.error);
  if (attempt.outcome != ImageLock::Outcome::held)
    throw CommandFailure(ExitCode::refused, attempt.error);
  return {std::move(image), std::move(attempt.lock)};
}

LockedImage openImageForWriting(const std::string& path) { return lockImage(openImage(path)); }

}  // namespace tools
