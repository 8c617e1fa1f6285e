#pragma once

#include <string>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "host/MigratorBundle.h"
#include "host/Settings.h"

namespace host {

// Why the image cannot be migrated, one sentence each that names the file and the remedy; none when
// it can. Only looks:
//
// - the settings file, when there is one, is readable as a dictionary, and each account in it has a
//   type that is known to each bundle which lists its types: an account that a migrator cannot read
//   would be gone after its first save;
// - tmp/ is a directory on the settings file's file system, else no save could replace the file,
//   and not everybody may replace the files in it;
// - "mobile" is in the image's user database as a user and a group, and the caller is root or that
//   user, of that group: only they can give the settings file its owner;
// - settings and logs can be written. (A database that cannot be used is left alone.)
std::vector<std::string> reasonsNotToStart(const deviceimage::DeviceImage& image,
                                           const Settings& settings,
                                           const std::vector<MigratorBundle>& bundles);

}  // namespace host
