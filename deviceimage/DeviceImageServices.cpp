#include "deviceimage/DeviceImageServices.h"

#include <utility>

#include "deviceimage/Database.h"
#include "deviceimage/ImageCalendarStore.h"
#include "deviceimage/ImageContactsStore.h"
#include "deviceimage/ImageFileServices.h"
#include "deviceimage/ImageLock.h"
#include "deviceimage/ImageMessages.h"
#include "deviceimage/ImagePreferences.h"
#include "deviceimage/ImageProperties.h"
#include "deviceimage/ImageSyncDataSource.h"
#include "platform/posix/DlAddrBundleResources.h"
#include "platform/posix/LinuxProcessTable.h"
#include "platform/posix/MonotonicClock.h"
#include "platform/posix/ProcessClassRegistry.h"
#include "platform/posix/RandomUUIDGenerator.h"

namespace deviceimage {

class DeviceImageServices::Implementation {
 public:
  Implementation(const std::shared_ptr<const DeviceImage>& image, ServiceOptions options)
      : _databases(image, DatabaseAccess::readWrite, std::move(options.databasesLeftAlone)),
        _accountFramework(image),
        _bundleResources(options.preferredLanguages, std::move(options.resourceDirectory)),
        _calendarStore(_databases),
        _contactsStore(_databases),
        _deviceInfo(image),
        _fileLocks(image),
        _fileServices(image),
        _preferences(image),
        _processTable(image->rootPath()),
        _restrictions(image),
        _syncDataSource(_databases),
        _systemLog(image, std::move(options.processName), std::move(options.logSink),
                   options.writesLog),
        _notifyCenter(image),
        _userDatabase(image),
        _services{
            _accountFramework, _bundleResources, _calendarStore, _classRegistry,  _clock,
            _contactsStore,    _deviceInfo,      _fileLocks,     _fileServices,   _preferences,
            _processTable,     _restrictions,    _runLoop,       _syncDataSource, _systemLog,
            _notifyCenter,     _uuidGenerator,   _userDatabase} {}

  const platform::Services& services() const { return _services; }
  platform::PollRunLoop& runLoop() { return _runLoop; }

 private:
  DatabaseSet _databases;
  ImageAccountFramework _accountFramework;
  platform::DlAddrBundleResources _bundleResources;
  ImageCalendarStore _calendarStore;
  platform::ProcessClassRegistry _classRegistry;
  platform::MonotonicClock _clock;
  ImageContactsStore _contactsStore;
  ImageDeviceInfo _deviceInfo;
  ImageFileLocks _fileLocks;
  ImageFileServices _fileServices;
  ImagePreferences _preferences;
  platform::LinuxProcessTable _processTable;
  ImageRestrictions _restrictions;
  platform::PollRunLoop _runLoop;
  ImageSyncDataSource _syncDataSource;
  ImageSystemLog _systemLog;
  ImageNotifyCenter _notifyCenter;
  platform::RandomUUIDGenerator _uuidGenerator;
  ImageUserDatabase _userDatabase;
  platform::Services _services;
};

DeviceImageServices::DeviceImageServices(const std::shared_ptr<const DeviceImage>& image,
                                         ServiceOptions options)
    : _implementation(std::make_unique<Implementation>(image, std::move(options))) {}

DeviceImageServices::~DeviceImageServices() = default;

const platform::Services& DeviceImageServices::services() const {
  return _implementation->services();
}

platform::PollRunLoop& DeviceImageServices::runLoop() { return _implementation->runLoop(); }

}  // namespace deviceimage
