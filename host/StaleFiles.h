#pragma once

#include <string>
#include <vector>

#include "deviceimage/DeviceImage.h"

namespace host {

// Removes the temporary files that saves of an earlier run left in the image's tmp/ when they were
// killed, and answers their names. Called while the image's lock is held, so that no save is under
// way.
//
// Only what such a save can have left is taken: a name as tempnam makes it without a prefix ("file"
// with six letters or digits), a regular file with one name and mode 0600 that belongs to the
// caller or to the image's "mobile", and is empty or begins like a binary property list. Everything
// else in tmp/ is somebody's own, side copies of unreadable settings among it.
std::vector<std::string> removeStaleTemporaryFiles(const deviceimage::DeviceImage& image);

}  // namespace host
