#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/RecordStores.h"

namespace host {

// A database that a run leaves alone, so that what cannot be read or written keeps none of the
// others from being migrated.
struct UnusableDatabase {
  std::string path;         // relative to the image
  std::string why;          // the rest of a sentence that begins with the path
  bool isReadable = false;  // only writing is impossible
  // Nothing says that the database is unusable, only that it cannot be looked at now: leaving it
  // alone would strand its records, whose account goes.
  bool mayPass = false;
};

// Rolls back what a killed run may have left in the databases; then, which of them are damaged, of
// another program or version, held by somebody else, or not to be written. They are looked at
// through `stores`, which may be read-only.
std::vector<UnusableDatabase> findUnusableDatabases(
    const std::shared_ptr<const deviceimage::DeviceImage>& image,
    deviceimage::RecordStores& stores);

// Rolls back what a migrator that was ended in the middle of a change left in the others.
void rollBackLeftovers(const std::shared_ptr<const deviceimage::DeviceImage>& image,
                       const std::vector<UnusableDatabase>& leftAlone);

// Their paths as one argument of a command, and back.
std::string joinedPaths(const std::vector<UnusableDatabase>& databases);
std::vector<std::string> pathsJoinedIn(std::string_view joined);

// What is wrong with the databases that are not among `leftAlone`: a sentence each.
std::vector<std::string> newDamage(const deviceimage::DeviceImage& image,
                                   deviceimage::RecordStores& stores,
                                   const std::vector<UnusableDatabase>& leftAlone);

}  // namespace host
