#pragma once

#include "platform/AccountFramework.h"
#include "platform/BundleResources.h"
#include "platform/CalendarStore.h"
#include "platform/ClassRegistry.h"
#include "platform/Clock.h"
#include "platform/ContactsStore.h"
#include "platform/DeviceInfo.h"
#include "platform/ExclusiveFileLock.h"
#include "platform/Export.h"
#include "platform/FileServices.h"
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

// All that a plug-in may reach outside its process, one service per role.
struct Services {
  AccountFramework& accountFramework;
  BundleResources& bundleResources;
  CalendarStore& calendarStore;
  ClassRegistry& classRegistry;
  Clock& clock;
  ContactsStore& contactsStore;
  DeviceInfo& deviceInfo;
  ExclusiveFileLock& exclusiveFileLock;
  FileServices& fileServices;
  PreferencesService& preferences;
  ProcessTable& processTable;
  RestrictionsService& restrictions;
  RunLoop& runLoop;
  SyncDataSource& syncDataSource;
  SystemLog& systemLog;
  SystemNotifyCenter& notifyCenter;
  UUIDGenerator& uuidGenerator;
  UserDatabase& userDatabase;
  WebEngineThreadLock* webEngineThreadLock = nullptr;  // null on a device without the web engine
};

// Installs the services of this process, which outlive everything that uses them. Called before a
// plug-in is created; a test may install others later. No lock is taken: while it runs, no other
// thread may call it or services(), or use what services() answered before. What happens before it
// on other threads, and what they do after it, the caller puts in order, as by starting them later.
PLATFORM_EXPORT void install(const Services& services);

// The installed services. An InternalConsistencyFailure when none are. Any thread, but not during
// install.
PLATFORM_EXPORT const Services& services();

}  // namespace platform
