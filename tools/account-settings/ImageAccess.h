#pragma once

#include <memory>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/ImageLock.h"
#include "platform/ExclusiveFileLock.h"

// What commands do before they work on an image. Each ends the command when it cannot.
namespace tools {

// The image's lock; waits `wait` seconds while another run holds it.
std::unique_ptr<deviceimage::ImageLock> takeLock(const deviceimage::DeviceImage& image,
                                                 double wait);

// Has the library write its temporary file into the image's tmp/: it moves the file over the
// settings file, which must be on the same file system.
void useTemporaryDirectory(const deviceimage::DeviceImage& image);

// The lock under which every program migrates the image's settings; waits for it, however long that
// takes. The image's services are installed.
platform::HeldFileLockPtr holdMigrationLock(const deviceimage::DeviceImage& image);
// Returns when no program holds that lock.
void waitForOtherMigrations(const deviceimage::DeviceImage& image);

}  // namespace tools
