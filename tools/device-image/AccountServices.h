#pragma once

#include <string>
#include <vector>

#include "deviceimage/DeviceImage.h"

namespace tools {

// The bundles of the account services: those that the installed catalogue of account creators names
// below the image's System/Library/AccountServices. With them goes the accounts data migrator, a
// folder among the image's migrators.

// One file of a bundle as it is installed beside the programs.
struct AccountService {
  std::string file;  // its name in the image
  std::string content;
};

// All of them. A catalogue or bundle that cannot be read ends the command before anything is
// written.
std::vector<AccountService> installedServices();

// Puts them into the image, up to the first that cannot be written.
platform::Status placeServices(const deviceimage::DeviceImage& image,
                               const std::vector<AccountService>& services);

// What is to be said of the services in the image.
struct ServicesCheck {
  std::vector<deviceimage::ImageProblem> missing;
  std::vector<deviceimage::ImageProblem> warnings;  // nothing is broken
};
ServicesCheck checkServices(const deviceimage::DeviceImage& image);

}  // namespace tools
