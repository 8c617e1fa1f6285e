// The services over a device image, run through the contracts of the platform's interfaces.
#include <algorithm>
#include <fstream>
#include <nlohmann/json.hpp>

#include "deviceimage/DeviceImageServices.h"
#include "tests/contracts/AccountFrameworkContract.h"
#include "tests/contracts/CalendarStoreContract.h"
#include "tests/contracts/ContactsStoreContract.h"
#include "tests/contracts/DeviceInfoContract.h"
#include "tests/contracts/ExclusiveFileLockContract.h"
#include "tests/contracts/FileServicesContract.h"
#include "tests/contracts/NotifyCenterContract.h"
#include "tests/contracts/PreferencesContract.h"
#include "tests/contracts/ProcessTableContract.h"
#include "tests/contracts/RestrictionsContract.h"
#include "tests/contracts/RunLoopContract.h"
#include "tests/contracts/StartedProcesses.h"
#include "tests/contracts/SyncDataSourceContract.h"
#include "tests/contracts/SystemLogContract.h"
#include "tests/contracts/UserDatabaseContract.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace {

using deviceimage::Dataclass;
using deviceimage::DeviceImage;
using deviceimage::DeviceImageServices;
using deviceimage::RecordStores;
using testing::Values;

// A new image with its services.
template <typename UnderTest>
class OnAnImage : public UnderTest {
 protected:
  const platform::Services& services() const { return _services->services(); }
  void renewServices() {
    _services.reset();
    _services = std::make_unique<DeviceImageServices>(image.image);
  }
  // Puts `value` under `key` of a property list in the image.
  void putIntoList(std::string_view file, const std::string& key,
                   const propertylist::Value& value) {
    const propertylist::FileReadResult read = image.image->readPropertyList(file);
    propertylist::Dictionary properties;
    if (read.value) properties = *read.value->asDictionary();
    properties.set(key, value);
    EXPECT_TRUE(image.image->writePropertyList(file, properties).isSuccess());
  }
  std::vector<std::string> linesIn(std::string_view name) const {
    std::ifstream file(image.path(name));
    std::vector<std::string> lines;
    for (std::string line; std::getline(file, line);) lines.push_back(line);
    return lines;
  }

  deviceimage::TemporaryImage image;

 private:
  std::unique_ptr<DeviceImageServices> _services =
      std::make_unique<DeviceImageServices>(image.image);
};

class ImageDataSources : public OnAnImage<SyncDataSourceUnderTest> {
 public:
  platform::SyncDataSource& service() override { return services().syncDataSource; }
  void restart() override { renewServices(); }
  void addRecord(Records kind, const Account& account, const std::string& uid,
                 const std::string& content) override {
    const auto added = image.stores().addRecords(dataclassOf(kind), account,
                                                 std::vector{deviceimage::record(uid, content)});
    EXPECT_TRUE(added.status.isSuccess());
  }
  std::vector<std::string> contents(Records kind, const Account& account) override {
    return contentsOfStores(kind, account, false);
  }
  std::vector<std::string> retiredContents(Records kind, const std::string& account) override {
    return contentsOfStores(kind, account, true);
  }
  bool storeExists(Records kind, const Account& account) override {
    return image.stores().findStore(dataclassOf(kind), account).store.has_value();
  }
  void setSyncAnchors(Records kind, const Account& account) override {
    RecordStores stores = image.stores();
    const deviceimage::Row row = stores.findStore(dataclassOf(kind), account).store->row;
    EXPECT_TRUE(stores.setSyncAnchor(dataclassOf(kind), row, "17").isSuccess());
  }
  bool hasSyncAnchors(Records kind, const Account& account) override {
    RecordStores stores = image.stores();
    const deviceimage::Row row = stores.findStore(dataclassOf(kind), account).store->row;
    return stores.syncAnchor(dataclassOf(kind), row).anchor.has_value();
  }

 private:
  static Dataclass dataclassOf(Records kind) {
    switch (kind) {
      case Records::contacts:
        return Dataclass::contacts;
      case Records::events:
        return Dataclass::calendars;
      case Records::reminders:
        return Dataclass::reminders;
      case Records::notes:
        break;
    }
    return Dataclass::notes;
  }
  std::vector<std::string> contentsOfStores(Records kind, const Account& account, bool retired) {
    RecordStores stores = image.stores();
    std::vector<std::string> contents;
    for (const deviceimage::Store& store : stores.listStores(dataclassOf(kind)).stores) {
      if (store.account != account || store.retired != retired) continue;
      EXPECT_TRUE(stores
                      .visitRecords(dataclassOf(kind), store.row, true,
                                    [&](const deviceimage::Record&, std::string_view content) {
                                      contents.emplace_back(content);
                                      return true;
                                    })
                      .isSuccess());
    }
    std::sort(contents.begin(), contents.end());
    return contents;
  }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, SyncDataSourceContract,
                         Values(portOf<ImageDataSources>("DeviceImage")));

class ImageContacts : public OnAnImage<ContactsStoreUnderTest> {
 public:
  ImageContacts() {
    EXPECT_TRUE(image.stores().ensureStore(Dataclass::contacts, std::nullopt).isSuccess());
  }
  platform::ContactsStore& service() override { return services().contactsStore; }
  void addAccountSource() override {
    EXPECT_TRUE(image.stores().ensureStore(Dataclass::contacts, "account").isSuccess());
  }
  bool isLocalSourceEnabled() override {
    return image.stores().findStore(Dataclass::contacts, std::nullopt).store->visible;
  }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, ContactsStoreContract,
                         Values(portOf<ImageContacts>("DeviceImage")));

class ImageCalendars : public OnAnImage<CalendarStoreUnderTest> {
 public:
  ImageCalendars() {
    EXPECT_TRUE(image.stores().ensureStore(Dataclass::calendars, std::nullopt).isSuccess());
  }
  platform::CalendarStore& service() override { return services().calendarStore; }
  void addAccountStore() override {
    EXPECT_TRUE(image.stores().ensureStore(Dataclass::calendars, "account").isSuccess());
  }
  LocalStore localStore() override {
    LocalStore local;
    local.allowsEvents = look(Dataclass::calendars, local.writableEventCalendars, nullptr);
    local.allowsReminders = look(Dataclass::reminders, local.writableReminderCalendars,
                                 &local.newRemindersHaveADefaultCalendar);
    return local;
  }

 private:
  // Whether the local store shows the kind; counts its writable calendars.
  bool look(Dataclass dataclass, int& writable, bool* hasDefault) {
    RecordStores stores = image.stores();
    const deviceimage::Store store = *stores.findStore(dataclass, std::nullopt).store;
    for (const deviceimage::Collection& calendar :
         stores.listCollections(dataclass, store.row).collections) {
      if (calendar.writable) ++writable;
      if (calendar.isDefault && hasDefault != nullptr) *hasDefault = true;
    }
    return store.visible;
  }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, CalendarStoreContract,
                         Values(portOf<ImageCalendars>("DeviceImage")));

class ImageLog : public OnAnImage<SystemLogUnderTest> {
 public:
  platform::SystemLog& service() override { return services().systemLog; }
  std::vector<std::string> entries() override { return linesIn(DeviceImage::kSystemLogFile); }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, SystemLogContract, Values(portOf<ImageLog>("DeviceImage")));

class ImageNotifications : public OnAnImage<NotifyCenterUnderTest> {
 public:
  platform::SystemNotifyCenter& service() override { return services().notifyCenter; }
  std::vector<std::string> posted() override {
    std::vector<std::string> names;
    for (const std::string& line : linesIn(DeviceImage::kNotificationsFile))
      names.push_back(nlohmann::json::parse(line).at("name"));
    return names;
  }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, NotifyCenterContract,
                         Values(portOf<ImageNotifications>("DeviceImage")));

class ImagePreferenceFiles : public OnAnImage<PreferencesUnderTest> {
 public:
  platform::PreferencesService& service() override { return services().preferences; }
  void setDefault(const std::string& key, const propertylist::Value& value) override {
    putIntoList(DeviceImage::kProcessDefaultsFile, key, value);
  }
  void setPreference(const std::string& application, const std::string& key,
                     const propertylist::Value& value) override {
    putIntoList(*DeviceImage::preferencesFile(application), key, value);
  }
  std::vector<std::pair<std::string, std::string>> postedChanges() override {
    std::vector<std::pair<std::string, std::string>> changes;
    for (const std::string& line : linesIn(DeviceImage::kPreferenceChangesFile)) {
      const nlohmann::json change = nlohmann::json::parse(line);
      changes.emplace_back(change.at("application"), change.at("key"));
    }
    return changes;
  }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, PreferencesContract,
                         Values(portOf<ImagePreferenceFiles>("DeviceImage")));

class ImageUsers : public OnAnImage<UserDatabaseUnderTest> {
 public:
  platform::UserDatabase& service() override { return services().userDatabase; }
  uid_t mobileUser() override { return ::geteuid() == 0 ? 501 : ::geteuid(); }
  gid_t mobileGroup() override { return ::geteuid() == 0 ? 501 : ::getegid(); }
  void removeMobile() override {
    for (const std::string_view file : {DeviceImage::kUsersFile, DeviceImage::kGroupsFile})
      EXPECT_TRUE(image.image->writeFile(file, {}).isSuccess());
  }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, UserDatabaseContract,
                         Values(portOf<ImageUsers>("DeviceImage")));

class ImageRestrictionStates : public OnAnImage<RestrictionsUnderTest> {
 public:
  platform::RestrictionsService& service() override { return services().restrictions; }
  void setForbidden(platform::RestrictedFeature feature, bool forbidden) override {
    constexpr const char* kKeys[] = {"CloudDocumentSync", "PhotoStream", "SharedPhotoStreams",
                                     "CloudBackup", "CardsWhileLocked"};  // in the features' order
    putIntoList(DeviceImage::kRestrictionsFile, kKeys[static_cast<std::size_t>(feature)],
                forbidden ? 2 : 1);
    renewServices();  // which have read the file already
  }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, RestrictionsContract,
                         Values(portOf<ImageRestrictionStates>("DeviceImage")));

class ImageDevice : public OnAnImage<DeviceInfoUnderTest> {
 public:
  platform::DeviceInfo& service() override { return services().deviceInfo; }
  void setProperty(const std::string& key, const std::string& value) override {
    putIntoList(DeviceImage::kDevicePropertiesFile, key, value);
  }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, DeviceInfoContract,
                         Values(portOf<ImageDevice>("DeviceImage")));

class ImageAccounts : public OnAnImage<AccountFrameworkUnderTest> {
 public:
  platform::AccountFramework& service() override { return services().accountFramework; }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, AccountFrameworkContract,
                         Values(portOf<ImageAccounts>("DeviceImage")));

class ImageFiles : public OnAnImage<FileServicesUnderTest> {
 public:
  platform::FileServices& service() override { return services().fileServices; }
  std::string directory() override { return image.image->temporaryDirectory(); }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, FileServicesContract,
                         Values(portOf<ImageFiles>("DeviceImage")));

class ImageLocks : public OnAnImage<ExclusiveFileLockUnderTest> {
 public:
  platform::ExclusiveFileLock& service() override { return services().exclusiveFileLock; }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, ExclusiveFileLockContract,
                         Values(portOf<ImageLocks>("DeviceImage")));

class ImageProcesses : public OnAnImage<ProcessTableUnderTest> {
 public:
  platform::ProcessTable& service() override { return services().processTable; }
  std::optional<pid_t> startProcess(const std::string& commandName) override {
    return _started.start("/bin/sleep", image.path("usr/libexec"), commandName, {"1000"});
  }
  bool hasEnded(pid_t process) override { return _started.waitForEnd(process) == SIGKILL; }
  pid_t unusedIdentifier() override { return 1 << 22; }  // the kernel's numbers are below

 private:
  StartedProcesses _started;
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, ProcessTableContract,
                         Values(portOf<ImageProcesses>("DeviceImage")));

class ImageRunLoop : public OnAnImage<RunLoopUnderTest> {
 public:
  platform::RunLoop& service() override { return services().runLoop; }
  platform::Clock& clock() override { return services().clock; }
};
INSTANTIATE_TEST_SUITE_P(DeviceImage, RunLoopContract, Values(portOf<ImageRunLoop>("DeviceImage")));

}  // namespace
