// The destructors of the interfaces. They are defined here and nowhere else, so that the type
// information of every interface lives in this library and a dynamic_cast agrees across bundles.

#include "platform/AccountFramework.h"
#include "platform/BundleResources.h"
#include "platform/CalendarStore.h"
#include "platform/ClassRegistry.h"
#include "platform/Clock.h"
#include "platform/ContactsStore.h"
#include "platform/DataClassMigrator.h"
#include "platform/DeviceInfo.h"
#include "platform/ExclusiveFileLock.h"
#include "platform/FileServices.h"
#include "platform/LogFormat.h"
#include "platform/PreferencesService.h"
#include "platform/ProcessTable.h"
#include "platform/RestrictionsService.h"
#include "platform/RunLoop.h"
#include "platform/SyncDataSource.h"
#include "platform/SystemLog.h"
#include "platform/SystemNotifyCenter.h"
#include "platform/UUIDGenerator.h"
#include "platform/UserDatabase.h"
#include "platform/WebEngineThreadLock.h"

namespace platform {

AccountFramework::~AccountFramework() = default;
BundleResources::~BundleResources() = default;
CalendarDatabase::~CalendarDatabase() = default;
CalendarStoreHandle::~CalendarStoreHandle() = default;
CalendarStore::~CalendarStore() = default;
RuntimeClass::~RuntimeClass() = default;
CodeBundle::~CodeBundle() = default;
ClassRegistry::~ClassRegistry() = default;
Clock::~Clock() = default;
AddressBook::~AddressBook() = default;
ContactsSource::~ContactsSource() = default;
ContactsStore::~ContactsStore() = default;
DataClassMigrator::~DataClassMigrator() = default;
DataClassMigratorClass::~DataClassMigratorClass() = default;
DeviceInfo::~DeviceInfo() = default;
HeldFileLock::~HeldFileLock() = default;
ExclusiveFileLock::~ExclusiveFileLock() = default;
FileServices::~FileServices() = default;
Describable::~Describable() = default;
PreferencesService::~PreferencesService() = default;
ProcessTable::~ProcessTable() = default;
RestrictionsService::~RestrictionsService() = default;
RunLoop::~RunLoop() = default;
DataSource::~DataSource() = default;
SyncDataSource::~SyncDataSource() = default;
SystemLog::~SystemLog() = default;
SystemNotifyCenter::~SystemNotifyCenter() = default;
UUIDGenerator::~UUIDGenerator() = default;
UserDatabase::~UserDatabase() = default;
WebEngineThreadLock::~WebEngineThreadLock() = default;

}  // namespace platform
