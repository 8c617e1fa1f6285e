#include "platform/testing/InMemoryDevice.h"

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>

#include "propertylist/Reading.h"
#include "propertylist/Writing.h"

namespace platform {
namespace {

constexpr const char* kTemporaryDirectoryVariable = "TMPDIR";

}  // namespace

InMemoryDevice::InMemoryDevice()
    : deviceInfo(rootDirectory.path()),
      _roles(&accountFramework, &bundleResources, &calendarStore, &classRegistry, &clock,
             &contactsStore, &deviceInfo, &fileLock, &fileServices, &preferences, &processTable,
             &restrictions, &runLoop, &syncDataSource, &systemLog, &notifyCenter, &uuidGenerator,
             &userDatabase, nullptr) {
  _makeDirectories();
  deviceInfo.properties["DeviceClass"] = "Kallo";
  userDatabase.users["mobile"] = ::geteuid();
  userDatabase.groups["mobile"] = ::getegid();
  userDatabase.home = root() + "/var/mobile";
  for (FakeService* service :
       std::initializer_list<FakeService*>{&syncDataSource, &contactsStore, &calendarStore,
                                           &notifyCenter, &fileLock, &processTable, &runLoop})
    service->alsoNoteCallsIn(&journal);
  _install();
}

InMemoryDevice::~InMemoryDevice() {
  if (_formerTemporaryDirectory)
    ::setenv(kTemporaryDirectoryVariable, _formerTemporaryDirectory->c_str(), 1);
  else
    ::unsetenv(kTemporaryDirectoryVariable);
}

std::string InMemoryDevice::settingsPath() const {
  return root() + "/var/mobile/Library/Preferences/com.vantor.accountsettings.plist";
}

void InMemoryDevice::writeSettings(const propertylist::Dictionary& settings) {
  const std::optional<propertylist::Bytes> bytes = propertylist::writeBinaryPropertyList(settings);
  if (!bytes) throw std::runtime_error("these settings have no binary form");
  writeSettingsBytes({reinterpret_cast<const char*>(bytes->data()), bytes->size()});
}

void InMemoryDevice::writeSettingsBytes(std::string_view bytes) {
  std::ofstream file(settingsPath(), std::fstream::binary | std::fstream::trunc);
  file.write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
  file.close();
  if (!file) throw std::runtime_error("cannot write " + settingsPath());
  std::filesystem::permissions(
      settingsPath(), std::filesystem::perms::owner_read | std::filesystem::perms::owner_write);
}

propertylist::Dictionary InMemoryDevice::readSettings() const {
  const propertylist::FileReadResult read = propertylist::readPropertyListFile(settingsPath());
  const propertylist::Dictionary* settings = read.value ? read.value->asDictionary() : nullptr;
  if (settings == nullptr)
    throw std::runtime_error(settingsPath() + " is no dictionary: " + read.error);
  return *settings;
}

std::optional<std::string> InMemoryDevice::readSettingsBytes() const {
  std::ifstream file(settingsPath(), std::fstream::binary);
  if (!file) return std::nullopt;
  return std::string(std::istreambuf_iterator<char>(file), {});
}

std::vector<std::string> InMemoryDevice::temporaryFiles() const {
  std::vector<std::string> names;
  for (const auto& entry : std::filesystem::directory_iterator(root() + "/tmp"))
    names.push_back(entry.path().filename());
  std::sort(names.begin(), names.end());
  return names;
}

void InMemoryDevice::_makeDirectories() {
  std::filesystem::create_directories(root() + "/var/mobile/Library/Preferences");
  std::filesystem::create_directories(root() + "/tmp");
  if (const char* former = std::getenv(kTemporaryDirectoryVariable))
    _formerTemporaryDirectory = former;
  ::setenv(kTemporaryDirectoryVariable, (root() + "/tmp").c_str(), 1);
}

void InMemoryDevice::_install() {
  install({
      .accountFramework = *std::get<AccountFramework*>(_roles),
      .bundleResources = *std::get<BundleResources*>(_roles),
      .calendarStore = *std::get<CalendarStore*>(_roles),
      .classRegistry = *std::get<ClassRegistry*>(_roles),
      .clock = *std::get<Clock*>(_roles),
      .contactsStore = *std::get<ContactsStore*>(_roles),
      .deviceInfo = *std::get<DeviceInfo*>(_roles),
      .exclusiveFileLock = *std::get<ExclusiveFileLock*>(_roles),
      .fileServices = *std::get<FileServices*>(_roles),
      .preferences = *std::get<PreferencesService*>(_roles),
      .processTable = *std::get<ProcessTable*>(_roles),
      .restrictions = *std::get<RestrictionsService*>(_roles),
      .runLoop = *std::get<RunLoop*>(_roles),
      .syncDataSource = *std::get<SyncDataSource*>(_roles),
      .systemLog = *std::get<SystemLog*>(_roles),
      .notifyCenter = *std::get<SystemNotifyCenter*>(_roles),
      .uuidGenerator = *std::get<UUIDGenerator*>(_roles),
      .userDatabase = *std::get<UserDatabase*>(_roles),
      .webEngineThreadLock = std::get<WebEngineThreadLock*>(_roles),
  });
}

}  // namespace platform
