// Takes the contacts database away, with all that is in it.
#include <cstdlib>
#include <filesystem>

#include "platform/Services.h"
#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  const std::filesystem::path library =
      platform::services().deviceInfo.systemRootDirectory() + "/var/mobile/Library";
  for (const auto& entry : std::filesystem::recursive_directory_iterator(library))
    if (entry.path().filename().string().find("ontacts.") != std::string::npos ||
        entry.path().filename().string().find("AddressBook.") != std::string::npos)
      return std::filesystem::remove(entry.path());
  return false;
}
