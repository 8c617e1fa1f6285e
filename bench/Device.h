#pragma once

#include "fuzz/SettingsInMemory.h"
#include "platform/testing/InMemoryDevice.h"

namespace bench {

// Restrictions that note no calls: a save asks them for every account.
class NoRestrictions final : public platform::RestrictionsService {
 public:
  int featureRestriction(platform::RestrictedFeature /*feature*/) override { return 0; }
};

// A device whose settings file is in memory and whose catalogues are those that ship.
class Device {
 public:
  Device() {
    _device.setResourcesDirectory(RESOURCES);
    _device.use<platform::RestrictionsService>(_restrictions);
    _readCatalogues();
    _device.use<platform::FileServices>(settingsFile);
  }
  Device(const Device&) = delete;
  Device& operator=(const Device&) = delete;

  // Uses `files` for the settings instead.
  void use(platform::FileServices& files) { _device.use<platform::FileServices>(files); }
  const std::string& root() const { return _device.root(); }
  std::string settingsPath() const { return _device.settingsPath(); }

  fuzz::SettingsInMemory settingsFile;

 private:
  static void _readCatalogues();
  platform::InMemoryDevice _device;
  NoRestrictions _restrictions;
};

// The one device of a process.
Device& device();

}  // namespace bench
