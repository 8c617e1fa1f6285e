#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "host/Settings.h"

namespace host {

// What a migrator bundle's Info.plist says. A bundle is a folder named *.migrator:
//
//   BundleIdentifier, Name     strings, for people
//   Kind                       "DataClassMigrator"
//   PlatformInterfaceVersion   the generation of the platform's interfaces it was built for
//   Executable                 plain name of the shared object beside Info.plist
//   PrincipalClass             name of the class that is made and run
//   RetiredAccountTypes        array of the account types that it retires; may be absent
//   RetiredServiceStatus       integer value of the service status that selects an account
//   CorrectedAccountKeys       array of the keys that it may put right in accounts that it keeps
//   AddedAccountTypes          array of the types of which it may add an account when there is none
//   UnkeepableAccounts         dictionary of what it cannot keep, as host::UnkeepableAccounts: the
//                              arrays AccountTypes, KnownClasses and KnownPathParts
//   RequiredResources          array of files that must lie in the bundle
//                              ("en.lproj/Names.strings")
//   AccountTypesResource       the property list, named without ".plist", whose keys are all known
//                              account types
struct MigratorBundle {
  std::string path;  // the folder; absolute, without links
  std::string name;
  std::string executable;  // whole path
  std::string principalClass;
  std::vector<std::string> retiredAccountTypes;
  std::int64_t retiredServiceStatus = 0;
  std::vector<std::string> correctedAccountKeys;
  std::vector<std::string> addedAccountTypes;
  UnkeepableAccounts unkeepableAccounts;
  // The known account types; empty when the bundle does not say.
  std::optional<std::vector<std::string>> accountTypes;
};

// Either a bundle, or the reasons why the host does not run what is at the path, each one sentence
// that names the file and the remedy.
struct ReadBundle {
  std::optional<MigratorBundle> bundle;
  std::vector<std::string> problems;
};

// Reads and checks the bundle in the folder at `path`; runs none of its code. Refused is a bundle
// of another kind or generation, one with a missing or unreadable file, and one whose files or
// folders somebody else than root and the caller may write, since they could make the host run
// anything.
ReadBundle readMigratorBundle(const std::string& path);

// The bundles in the image's folder of data-class migrators, in name order. Folders whose
// Info.plist is missing or names another kind are passed over: they belong to somebody else.
std::vector<ReadBundle> readMigratorBundlesOfImage(const deviceimage::DeviceImage& image);

// The one bundle in the folder `directory`, where the installation keeps it.
ReadBundle readInstalledMigratorBundle(const std::string& directory);

}  // namespace host
