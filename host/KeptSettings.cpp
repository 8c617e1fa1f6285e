#include "host/KeptSettings.h"

#include <algorithm>
#include <cerrno>
#include <map>
#include <optional>
#include <string_view>

#include "host/Settings.h"
#include "platform/posix/NumberedNames.h"

namespace host {
namespace {

using deviceimage::DeviceImage;

constexpr std::string_view kMark = ".before-migration-";

std::string nameOfCopy(unsigned number) {
  return std::string(DeviceImage::kSettingsFile) + std::string(kMark) + std::to_string(number);
}

// The names of the copies in the image, by number.
std::map<unsigned, std::string> copiesIn(const DeviceImage& image) {
  constexpr std::string_view kFile = DeviceImage::kSettingsFile;
  const std::string prefix = std::string(kFile.substr(kFile.rfind('/') + 1)) + std::string(kMark);
  std::map<unsigned, std::string> copies;
  for (const std::string& name : image.namesIn(DeviceImage::kPreferencesDirectory))
    if (const std::optional<unsigned> number = platform::numberAfter(prefix, name))
      copies.emplace(*number, nameOfCopy(*number));
  return copies;
}

}  // namespace

KeptSettings::KeptSettings(const DeviceImage& image)
    : _image(image), _content(image.readFile(DeviceImage::kSettingsFile)) {
  _file = readSettings(image).file;
  if (_content.exists) _keep();
}

void KeptSettings::_keep() {
  if (!_content.bytes) {
    _error = _content.error;
    return;
  }
  const std::map<unsigned, std::string> copies = copiesIn(_image);
  const auto equal = std::find_if(copies.begin(), copies.end(), [this](const auto& copy) {
    return _image.readFile(copy.second).bytes == _content.bytes;
  });
  if (equal != copies.end()) {
    _copy = equal->second;
    return;
  }
  unsigned free = 1;
  while (copies.contains(free)) ++free;
  const std::string name = nameOfCopy(free);
  const platform::Status status = _image.createFile(name, *_content.bytes);
  if (status.isSuccess()) {
    _copy = name;
    _wasMadeHere = true;
  } else {
    _error = status.error->description;
  }
}

void KeptSettings::_removeCopy() {
  if (!_wasMadeHere) return;
  _image.removeFile(_copy).ignore("one copy too many does no harm");
  _copy.clear();
}

SettingsFate KeptSettings::settle() {
  const Settings now = readSettings(_image);
  if (!now.exists) return _content.exists ? _putBack() : SettingsFate::untouched;
  if (!_content.exists || !isSameFile(_file, now.file)) return SettingsFate::replaced;
  _removeCopy();
  return SettingsFate::untouched;
}

SettingsFate KeptSettings::_putBack() {
  const platform::Status status = _image.createFile(DeviceImage::kSettingsFile, *_content.bytes);
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
