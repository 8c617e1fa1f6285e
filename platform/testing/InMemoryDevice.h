#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <tuple>
#include <type_traits>
#include <vector>

#include "platform/Services.h"
#include "platform/testing/InMemoryAccountFramework.h"
#include "platform/testing/InMemoryBundleResources.h"
#include "platform/testing/InMemoryCalendarStore.h"
#include "platform/testing/InMemoryClassRegistry.h"
#include "platform/testing/InMemoryClock.h"
#include "platform/testing/InMemoryContactsStore.h"
#include "platform/testing/InMemoryDeviceInfo.h"
#include "platform/testing/InMemoryFileLock.h"
#include "platform/testing/InMemoryNotifyCenter.h"
#include "platform/testing/InMemoryPreferences.h"
#include "platform/testing/InMemoryProcessTable.h"
#include "platform/testing/InMemoryRestrictions.h"
#include "platform/testing/InMemoryRunLoop.h"
#include "platform/testing/InMemorySyncDataSource.h"
#include "platform/testing/InMemorySystemLog.h"
#include "platform/testing/InMemoryUUIDGenerator.h"
#include "platform/testing/InMemoryUserDatabase.h"
#include "platform/testing/InMemoryWebEngineThreadLock.h"
#include "platform/testing/JournaledFileServices.h"
#include "platform/testing/TemporaryDirectory.h"

namespace platform {

// A whole device for one test: every service in memory, but for the files, which are real and lie
// in a directory of its own. Making it installs the services.
//
//   InMemoryDevice device;
//   device.setResourcesDirectory(RESOURCES_DIR);
//   device.writeSettings({{"Version", 12}, {"Accounts", Array{}}});
//   device.syncDataSource.failNext("commit(local");
//   ... run the code under test ...
//   EXPECT_EQ(device.journal, (CallJournal{"createDataSource(Contacts, none, none)", ...}));
//   EXPECT_EQ(device.logLines(), (std::vector<std::string>{...}));
//
// The device's root has var/mobile/Library/Preferences and tmp, which is also the process's
// directory for temporary files while the device lives. "mobile" is the user who runs the test.
// There is no web engine. One device at a time.
class InMemoryDevice {
 public:
  InMemoryDevice();
  ~InMemoryDevice();  // removes the directory; no service may be used any more
  InMemoryDevice(const InMemoryDevice&) = delete;
  InMemoryDevice& operator=(const InMemoryDevice&) = delete;

  const TemporaryDirectory rootDirectory;

  // What the code under test did to the device, in order: the calls of syncDataSource,
  // contactsStore, calendarStore, notifyCenter, fileLock, processTable and runLoop. Each service's
  // own calls() has its calls alone; alsoNoteCallsIn(&device.journal) adds a further one here.
  CallJournal journal;

  InMemorySystemLog systemLog;
  InMemoryAccountFramework accountFramework;
  InMemoryBundleResources bundleResources;
  InMemoryCalendarStore calendarStore;
  InMemoryClassRegistry classRegistry;
  InMemoryClock clock;
  InMemoryContactsStore contactsStore;
  InMemoryDeviceInfo deviceInfo;
  InMemoryFileLock fileLock;
  JournaledFileServices fileServices;
  InMemoryPreferences preferences;
  InMemoryProcessTable processTable;
  InMemoryRestrictions restrictions;
  InMemoryRunLoop runLoop{clock};
  InMemorySyncDataSource syncDataSource;
  InMemoryNotifyCenter notifyCenter;
  InMemoryUUIDGenerator uuidGenerator;
  InMemoryUserDatabase userDatabase;
  InMemoryWebEngineThreadLock webEngineThreadLock;  // installed by use<WebEngineThreadLock> only

  // Installs `service`, which outlives the device, in place of the device's own:
  //   device.use<FileServices>(failingFiles);
  template <typename Role>
  void use(std::type_identity_t<Role>& service) {
    std::get<Role*>(_roles) = &service;
    _install();
  }

  // The resource files that code finds beside it: the plug-in's resources/ folder, say.
  void setResourcesDirectory(const std::string& directory) {
    bundleResources.useDirectory(directory);
  }

  // The lines of the system log.
  std::vector<std::string> logLines() const { return systemLog.lines(); }

  // Absolute, without a "/" at its end.
  const std::string& root() const { return deviceInfo.systemRoot; }
  std::string settingsPath() const;
  // Writes the settings file as a binary property list, private, without the services.
  void writeSettings(const propertylist::Dictionary& settings);
  // Writes any bytes as the settings file.
  void writeSettingsBytes(std::string_view bytes);
  // The settings file as it is now. Throws std::runtime_error when it is no dictionary.
  propertylist::Dictionary readSettings() const;
  // Its bytes; empty when there is no file.
  std::optional<std::string> readSettingsBytes() const;
  // The names in the directory of temporary files, sorted.
  std::vector<std::string> temporaryFiles() const;

 private:
  using Roles = std::tuple<AccountFramework*, BundleResources*, CalendarStore*, ClassRegistry*,
                           Clock*, ContactsStore*, DeviceInfo*, ExclusiveFileLock*, FileServices*,
                           PreferencesService*, ProcessTable*, RestrictionsService*, RunLoop*,
                           SyncDataSource*, SystemLog*, SystemNotifyCenter*, UUIDGenerator*,
                           UserDatabase*, WebEngineThreadLock*>;
  void _makeDirectories();
  void _install();
  Roles _roles;
  std::optional<std::string> _formerTemporaryDirectory;
};

}  // namespace platform
