#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/DeviceImage.h"

// What older systems left behind in an image, and the image's accounts data migrator, which makes a
// settings file of it. docs/legacy-settings.md tells more.
namespace host {

// The migrator's bundle in an image, and the class in it.
inline constexpr std::string_view kAccountMigrator =
    "System/Library/DataClassMigrators/AccountMigrator.migrator";
inline constexpr std::string_view kAccountMigratorClass = "AccountsDataMigrator";
inline constexpr std::string_view kAccountMigratorName = "Account Migrator";
// The lock under which every program migrates settings.
inline constexpr std::string_view kMigrationLock = "AccountMigrationInProgress";

// What there is to migrate. With legacy files the settings file's version does not count: the file
// is built anew from them.
struct LegacyNeed {
  bool mailAccounts = false;  // there is a legacy mail accounts file
  bool dataAccess = false;    // there are legacy data-access preferences
  bool olderVersion = false;  // the settings file is older than the present version
  bool any() const { return mailAccounts || dataAccess || olderVersion; }
};
// Versions compare as unsigned numbers. A settings file that cannot be read, or has no version, is
// not an older one.
LegacyNeed legacyNeedOf(const deviceimage::DeviceImage& image);

// Why the image's accounts data migrator is not to be run, one sentence each: it is missing, or
// somebody else than root and the caller could have put its code there.
std::vector<std::string> reasonsAgainstAccountMigrator(const deviceimage::DeviceImage& image);

}  // namespace host
