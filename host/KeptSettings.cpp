#include "host/KeptSettings.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <optional>
#include <string_view>
#include <tuple>

#include "deviceimage/Descriptor.h"
#include "host/Settings.h"
#include "platform/posix/NumberedNames.h"

namespace host {
namespace {

using deviceimage::DeviceImage;
using deviceimage::FileLook;

constexpr std::string_view kMark = ".before-migration-";

std::string nameOfCopy(unsigned number) {
  return std::string(DeviceImage::kSettingsFile) + std::string(kMark) + std::to_string(number);
}

// The names of the copies in the image, by number. Only regular files are copies.
std::map<unsigned, std::string> copiesIn(const DeviceImage& image) {
  constexpr std::string_view kFile = DeviceImage::kSettingsFile;
  const std::string prefix = std::string(kFile.substr(kFile.rfind('/') + 1)) + std::string(kMark);
  std::map<unsigned, std::string> copies;
  for (const std::string& name : image.namesIn(DeviceImage::kPreferencesDirectory))
    if (const std::optional<unsigned> number = platform::numberAfter(prefix, name))
      if (image.lookAt(nameOfCopy(*number)).kind == FileLook::Kind::file)
        copies.emplace(*number, nameOfCopy(*number));
  return copies;
}

// What the file is; empty when it cannot be opened.
std::optional<struct stat> statusOf(const DeviceImage& image, const std::string& name) {
  const deviceimage::OpenedFile opened = image.openFile(name, O_RDONLY);
  if (!opened.status.isSuccess()) return std::nullopt;
  const deviceimage::Descriptor file(opened.descriptor);
  struct stat status = {};
  if (::fstat(file.number(), &status) != 0) return std::nullopt;
  return status;
}

std::map<std::string, timespec> timesOfCopies(const DeviceImage& image) {
  std::map<std::string, timespec> times;
  for (const auto& [number, name] : copiesIn(image))
    if (const auto status = statusOf(image, name)) times.emplace(name, status->st_mtim);
  return times;
}

bool isEarlier(const timespec& a, const timespec& b) {
  return std::tie(a.tv_sec, a.tv_nsec) < std::tie(b.tv_sec, b.tv_nsec);
}

// The newest copy; empty without one.
std::string newestCopy(const std::map<std::string, timespec>& times) {
  const auto newest =
      std::max_element(times.begin(), times.end(),
                       [](const auto& a, const auto& b) { return isEarlier(a.second, b.second); });
  return newest != times.end() ? newest->first : std::string();
}

// Whether nobody else can have written or may read the copy. For root, "mobile" is no stranger.
bool isPrivate(const DeviceImage& image, const std::string& copy) {
  const auto status = statusOf(image, copy);
  if (!status || (status->st_mode & 07777U) != (S_IRUSR | S_IWUSR)) return false;
  return status->st_uid == ::geteuid() ||
         (::geteuid() == 0 && status->st_uid == image.userNumber("mobile"));
}

// False when the copy cannot be made the newest one.
bool makeNewest(const DeviceImage& image, const std::string& copy) {
  const deviceimage::OpenedFile opened = image.openFile(copy, O_RDWR);
  if (!opened.status.isSuccess()) return false;
  const deviceimage::Descriptor file(opened.descriptor);
  return ::futimens(file.number(), nullptr) == 0;
}

}  // namespace

std::string keepSettings(const DeviceImage& image) {
  const deviceimage::FileContent content = image.readFile(DeviceImage::kSettingsFile);
  if (!content.exists) return {};
  if (!content.bytes) return content.error;
  for (const auto& [number, name] : copiesIn(image))
    if (image.readFile(name).bytes == content.bytes && isPrivate(image, name) &&
        makeNewest(image, name))
      return {};
  unsigned free = 1;
  while (image.lookAt(nameOfCopy(free)).kind != FileLook::Kind::nothing) ++free;
  const platform::Status status = image.createFile(nameOfCopy(free), *content.bytes);
  return status.isSuccess() ? std::string() : status.error->description;
}

KeptSettings::KeptSettings(const DeviceImage& image, bool keepsNow)
    : _image(image), _copiesBefore(timesOfCopies(image)) {
  const Settings before = readSettings(image);
  _existed = before.exists;
  _file = before.file;
  if (keepsNow) _error = keepSettings(image);
}

void KeptSettings::_findCopy() {
  for (const auto& [name, time] : timesOfCopies(_image)) {
    const auto before = _copiesBefore.find(name);
    if (before == _copiesBefore.end() || isEarlier(before->second, time)) _copy = name;
  }
}

void KeptSettings::_removeCopy() {
  if (_copy.empty() || _copiesBefore.contains(_copy)) return;
  _image.removeFile(_copy).ignore("one copy too many does no harm");
  _copy.clear();
}

SettingsFate KeptSettings::settle() {
  _findCopy();
  const Settings now = readSettings(_image);
  if (!now.exists) return _putBack();
  if (!_existed || !isSameFile(_file, now.file)) return SettingsFate::replaced;
  _removeCopy();
  return SettingsFate::untouched;
}

SettingsFate KeptSettings::_putBack() {
  const std::string source = newestCopy(timesOfCopies(_image));
  if (source.empty()) return _existed ? SettingsFate::lost : SettingsFate::untouched;
  const deviceimage::FileContent content = _image.readFile(source);
  if (!content.bytes) return SettingsFate::lost;
  const platform::Status status = _image.createFile(DeviceImage::kSettingsFile, *content.bytes);
  // A program that does not ask for the image's lock may have written one.
  if (status.code == EEXIST) return SettingsFate::replaced;
  if (!status.isSuccess()) return SettingsFate::lost;
  _removeCopy();
  return SettingsFate::putBack;
}

std::vector<std::string> keptSettingsOf(const DeviceImage& image) {
  std::vector<std::string> paths;
  for (const auto& [number, name] : copiesIn(image)) paths.push_back(image.absolutePath(name));
  return paths;
}

}  // namespace host
