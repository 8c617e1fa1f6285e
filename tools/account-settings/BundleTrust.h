#pragma once

#include "deviceimage/DeviceImage.h"

namespace tools {

// Ends the command, before anything is changed, when somebody else could have put code among the
// image's account services or in the place of a bundle that the catalogue of account creators
// names: a notifying save loads these into this process.
void requireTrustedServices(const deviceimage::DeviceImage& image);

}  // namespace tools
