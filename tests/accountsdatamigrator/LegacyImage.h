#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "propertylist/Value.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace accountsdatamigrator {

using accountsettings::ASSAccountsManager;
using propertylist::Array;
using propertylist::Dictionary;
using Lines = std::vector<std::string>;

inline constexpr const char* kMailFile = "var/mobile/Library/Mail/Accounts.plist";
inline constexpr const char* kDataAccessFile =
    "var/mobile/Library/Preferences/com.vantor.DataAccess.plist";
inline constexpr const char* kSettingsFile =
    "var/mobile/Library/Preferences/com.vantor.accountsettings.plist";
inline constexpr const char* kFailed =
    "[+[ASSAccountsManager _migrateAccountsIfNeeded]] Accounts migration failed";

// A test with an image that has the built accounts data migrator and no settings; its services are
// installed, so that the account settings library in this program works on it.
class LegacyTest : public testing::Test {
 protected:
  LegacyTest();
  ~LegacyTest() override;

  // Without a folder each bundle's resources are those beside it.
  void installServices(const std::optional<std::string>& resources);
  static void migrate() { ASSAccountsManager::_migrateAccountsIfNeeded(); }
  // Loads the bundle and runs its migrator, with no lock and nothing decided.
  bool execute() const;
  void write(std::string_view file, const Dictionary& root) const;
  void writeBytes(std::string_view file, const std::string& bytes) const;
  // The content of a file; empty when it is not there.
  std::optional<std::string> bytesOf(std::string_view file) const;
  // What another program finds in the settings file; an empty dictionary without one.
  Dictionary settings() const;
  Array accounts() const;
  // What lies in tmp/ and is not the migration lock.
  Lines temporaryFiles() const;
  // The lines of the system log. The image's path is "IMAGE" in them, and the third number of the
  // decision's line, an address, is "ADDRESS".
  Lines log() const;

  deviceimage::TemporaryImage image;

 private:
  Lines _log;
  std::unique_ptr<deviceimage::DeviceImageServices> _services;
};

}  // namespace accountsdatamigrator
