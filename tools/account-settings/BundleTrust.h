#pragma once

#include "deviceimage/DeviceImage.h"

namespace tools {

// Ends the command, before anything is changed, when somebody else could have put code among the
// image's account services, whose bundles a notifying save loads into this process.
void requireTrustedServices(const deviceimage::DeviceImage& image);

}  // namespace tools
