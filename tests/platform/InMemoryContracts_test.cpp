// The in-memory services keep the contracts too, or what is tested with them proves little. Also
// the worked example of how a port runs the contracts.

#include <algorithm>

#include "platform/testing/InMemoryDevice.h"
#include "tests/contracts/AccountFrameworkContract.h"
#include "tests/contracts/CalendarStoreContract.h"
#include "tests/contracts/ClassRegistryContract.h"
#include "tests/contracts/ClockContract.h"
#include "tests/contracts/ContactsStoreContract.h"
#include "tests/contracts/DeviceInfoContract.h"
#include "tests/contracts/ExclusiveFileLockContract.h"
#include "tests/contracts/FileServicesContract.h"
#include "tests/contracts/NotifyCenterContract.h"
#include "tests/contracts/PreferencesContract.h"
#include "tests/contracts/ProcessTableContract.h"
#include "tests/contracts/RestrictionsContract.h"
#include "tests/contracts/RunLoopContract.h"
#include "tests/contracts/SyncDataSourceContract.h"
#include "tests/contracts/SystemLogContract.h"
#include "tests/contracts/UUIDGeneratorContract.h"
#include "tests/contracts/UserDatabaseContract.h"
#include "tests/contracts/WebEngineThreadLockContract.h"

namespace {

using testing::Values;

class MemorySyncDataSource : public SyncDataSourceUnderTest {
 public:
  platform::SyncDataSource& service() override { return _service; }
  void restart() override {
  }  // nothing outlives the process, and nothing is kept besides the stores
  void addRecord(Records kind, const Account& account, const std::string& uid,
                 const std::string& content) override {
    _store(kind, account).records.push_back({uid, content, _recordKind(kind)});
  }
  std::vector<std::string> contents(Records kind, const Account& account) override {
    std::vector<std::string> contents;
    for (const auto& record : _service.records(account, _name(kind)))
      if (record.kind == _recordKind(kind)) contents.push_back(record.content);
    std::sort(contents.begin(), contents.end());
    return contents;
  }
  std::vector<std::string> retiredContents(Records kind, const std::string& account) override {
    std::vector<std::string> contents;
    for (const auto& retired : _service.retired)
      if (retired.account == account && retired.record.kind == _recordKind(kind))
        contents.push_back(retired.record.content);
    std::sort(contents.begin(), contents.end());
    return contents;
  }
  bool storeExists(Records kind, const Account& account) override {
    return _service.storeExists(account, _name(kind));
  }
  void setSyncAnchors(Records kind, const Account& account) override {
    _store(kind, account).hasAnchors = true;
  }
  bool hasSyncAnchors(Records kind, const Account& account) override {
    return _store(kind, account).hasAnchors;
  }

 private:
  using Memory = platform::InMemorySyncDataSource;
  static std::string _name(Records kind) {
    if (kind == Records::contacts) return "Contacts";
    return kind == Records::notes ? "Notes" : "Calendars";
  }
  static Memory::RecordKind _recordKind(Records kind) {
    if (kind == Records::events) return Memory::RecordKind::event;
    return kind == Records::reminders ? Memory::RecordKind::reminder : Memory::RecordKind::any;
  }
  Memory::Store& _store(Records kind, const Account& account) {
    return _service.stores[{account, _name(kind)}];
  }
  Memory _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, SyncDataSourceContract,
                         Values(portOf<MemorySyncDataSource>("InMemory")));

class MemoryContactsStore : public ContactsStoreUnderTest {
 public:
  platform::ContactsStore& service() override { return _service; }
  void addAccountSource() override { _service.sources.push_back({"account-1"}); }
  bool isLocalSourceEnabled() override { return _service.isSourceEnabled("local"); }

 private:
  platform::InMemoryContactsStore _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, ContactsStoreContract,
                         Values(portOf<MemoryContactsStore>("InMemory")));

class MemoryCalendarStore : public CalendarStoreUnderTest {
 public:
  platform::CalendarStore& service() override { return _service; }
  void addAccountStore() override { _service.contents.stores.push_back({"account-1"}); }
  LocalStore localStore() override {
    const auto& store = *_service.storeNamed("local");
    return {
        store.allowsEvents, store.allowsReminders,
        static_cast<int>(store.writableCalendars.count(platform::CalendarEntityType::events)),
        static_cast<int>(store.writableCalendars.count(platform::CalendarEntityType::reminders)),
        _service.contents.hasDefaultCalendarForNewReminders};
  }

 private:
  platform::InMemoryCalendarStore _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, CalendarStoreContract,
                         Values(portOf<MemoryCalendarStore>("InMemory")));

class MemoryPreferences : public PreferencesUnderTest {
 public:
  platform::PreferencesService& service() override { return _service; }
  void setDefault(const std::string& key, const propertylist::Value& value) override {
    _service.defaults.set(key, value);
  }
  void setPreference(const std::string& application, const std::string& key,
                     const propertylist::Value& value) override {
    _service.applications[application].set(key, value);
  }
  std::vector<std::pair<std::string, std::string>> postedChanges() override {
    return _service.posted;
  }

 private:
  platform::InMemoryPreferences _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, PreferencesContract,
                         Values(portOf<MemoryPreferences>("InMemory")));

class MemorySystemLog : public SystemLogUnderTest {
 public:
  platform::SystemLog& service() override { return _service; }
  std::vector<std::string> entries() override { return _service.lines(); }

 private:
  platform::InMemorySystemLog _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, SystemLogContract, Values(portOf<MemorySystemLog>("InMemory")));

class MemoryUserDatabase : public UserDatabaseUnderTest {
 public:
  MemoryUserDatabase() {
    _service.users["mobile"] = 501;
    _service.groups["mobile"] = 502;
  }
  platform::UserDatabase& service() override { return _service; }
  uid_t mobileUser() override { return 501; }
  gid_t mobileGroup() override { return 502; }
  void removeMobile() override {
    _service.users.clear();
    _service.groups.clear();
  }

 private:
  platform::InMemoryUserDatabase _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, UserDatabaseContract,
                         Values(portOf<MemoryUserDatabase>("InMemory")));

class MemoryDeviceInfo : public DeviceInfoUnderTest {
 public:
  platform::DeviceInfo& service() override { return _service; }
  void setProperty(const std::string& key, const std::string& value) override {
    _service.properties[key] = value;
  }

 private:
  platform::InMemoryDeviceInfo _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, DeviceInfoContract,
                         Values(portOf<MemoryDeviceInfo>("InMemory")));

class MemoryRestrictions : public RestrictionsUnderTest {
 public:
  platform::RestrictionsService& service() override { return _service; }
  void setForbidden(platform::RestrictedFeature feature, bool forbidden) override {
    _service.states[feature] = 0;
    if (forbidden) _service.forbid(feature);
  }

 private:
  platform::InMemoryRestrictions _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, RestrictionsContract,
                         Values(portOf<MemoryRestrictions>("InMemory")));

class MemoryNotifyCenter : public NotifyCenterUnderTest {
 public:
  platform::SystemNotifyCenter& service() override { return _service; }
  std::vector<std::string> posted() override { return _service.posted; }

 private:
  platform::InMemoryNotifyCenter _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, NotifyCenterContract,
                         Values(portOf<MemoryNotifyCenter>("InMemory")));

class MemoryFileLock : public ExclusiveFileLockUnderTest {
 public:
  platform::ExclusiveFileLock& service() override { return _service; }

 private:
  platform::InMemoryFileLock _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, ExclusiveFileLockContract,
                         Values(portOf<MemoryFileLock>("InMemory")));

class MemoryProcessTable : public ProcessTableUnderTest {
 public:
  platform::ProcessTable& service() override { return _service; }
  std::optional<pid_t> startProcess(const std::string& commandName) override {
    _service.processes.push_back({++_last, commandName});
    return _last;
  }
  bool hasEnded(pid_t process) override {
    return std::none_of(_service.processes.begin(), _service.processes.end(),
                        [&](const auto& running) { return running.identifier == process; });
  }
  pid_t unusedIdentifier() override { return _last + 1; }

 private:
  platform::InMemoryProcessTable _service;
  pid_t _last = 100;
};
INSTANTIATE_TEST_SUITE_P(InMemory, ProcessTableContract,
                         Values(portOf<MemoryProcessTable>("InMemory")));

class MemoryClassRegistry : public ClassRegistryUnderTest {
 public:
  MemoryClassRegistry() {
    _service.bundles[bundlePath()] = {{&_bundleClass}, "BundleClass"};
    _service.libraries[libraryPath()] = {{&_libraryClass}, std::nullopt};
  }
  platform::ClassRegistry& service() override { return _service; }
  std::string bundlePath() override { return "/Bundle.migrator"; }
  std::string libraryPath() override { return "/library.so"; }

 private:
  struct NamedClass : platform::RuntimeClass {
    explicit NamedClass(std::string given) : name(std::move(given)) {}
    std::string className() const override { return name; }
    std::string name;
  };
  NamedClass _bundleClass{"BundleClass"};
  NamedClass _libraryClass{"LibraryClass"};
  platform::InMemoryClassRegistry _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, ClassRegistryContract,
                         Values(portOf<MemoryClassRegistry>("InMemory")));

class MemoryUUIDGenerator : public UUIDGeneratorUnderTest {
 public:
  platform::UUIDGenerator& service() override { return _service; }

 private:
  platform::InMemoryUUIDGenerator _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, UUIDGeneratorContract,
                         Values(portOf<MemoryUUIDGenerator>("InMemory")));

class MemoryClock : public ClockUnderTest {
 public:
  platform::Clock& service() override { return _service; }

 private:
  platform::InMemoryClock _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, ClockContract, Values(portOf<MemoryClock>("InMemory")));

class MemoryRunLoop : public RunLoopUnderTest {
 public:
  platform::RunLoop& service() override { return _service; }
  platform::Clock& clock() override { return _clock; }

 private:
  platform::InMemoryClock _clock;
  platform::InMemoryRunLoop _service{_clock};
};
INSTANTIATE_TEST_SUITE_P(InMemory, RunLoopContract, Values(portOf<MemoryRunLoop>("InMemory")));

class JournaledFiles : public FileServicesUnderTest {
 public:
  platform::FileServices& service() override { return _service; }
  std::string directory() override { return _directory.path(); }

 private:
  platform::TemporaryDirectory _directory;
  platform::JournaledFileServices _service;
};
INSTANTIATE_TEST_SUITE_P(Journaled, FileServicesContract,
                         Values(portOf<JournaledFiles>("Journaled")));

class MemoryAccountFramework : public AccountFrameworkUnderTest {
 public:
  platform::AccountFramework& service() override { return _service; }

 private:
  platform::InMemoryAccountFramework _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, AccountFrameworkContract,
                         Values(portOf<MemoryAccountFramework>("InMemory")));

class MemoryWebEngineThreadLock : public WebEngineThreadLockUnderTest {
 public:
  platform::WebEngineThreadLock& service() override { return _service; }

 private:
  platform::InMemoryWebEngineThreadLock _service;
};
INSTANTIATE_TEST_SUITE_P(InMemory, WebEngineThreadLockContract,
                         Values(portOf<MemoryWebEngineThreadLock>("InMemory")));

}  // namespace
