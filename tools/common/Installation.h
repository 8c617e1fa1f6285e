#pragma once

#include <string>

namespace tools {

// What is installed beside the programs lies where these say, in the build tree and installed.

// The folder of the migrator bundles.
std::string installedMigrators();
// The folder with the resources of the account settings library: the installed plug-in's bundle.
std::string installedAccountResources();
// The folder of the account services' bundles.
std::string installedAccountServices();

}  // namespace tools
