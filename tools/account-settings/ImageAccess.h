#pragma once

#include <memory>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/ImageLock.h"

// What commands do before they work on an image. Each ends the command when it cannot.
namespace tools {

// The image's lock; waits `wait` seconds while another run holds it.
std::unique_ptr<deviceimage::ImageLock> takeLock(const deviceimage::DeviceImage& image,
                                                 double wait);

// Has the library write its temporary file into the image's tmp/: it moves the file over the
// settings file, which must be on the same file system.
void useTemporaryDirectory(const deviceimage::DeviceImage& image);

// Returns when no program holds the image's migration lock, however long that takes. The image's
// services are installed.
void waitForOtherMigrations(const deviceimage::DeviceImage& image);

}  // namespace tools
