#pragma once

#include <string>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "host/Settings.h"

namespace host {

// What is wrong with the settings file as a whole after a run, one sentence each: it must not be
// gone or unreadable. When it was written, it must be of the present version and a private file of
// "mobile"; one that was not touched may be as old as it was.
std::vector<std::string> checkSettingsFile(const deviceimage::DeviceImage& image,
                                           const Settings& before, const Settings& after);

}  // namespace host
