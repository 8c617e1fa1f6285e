#pragma once

#include <sys/stat.h>

#include <string>
#include <vector>

#include "deviceimage/DeviceImage.h"

namespace host {

// What became of the settings file.
enum class SettingsFate {
  untouched,  // it is the same file, or there is none as before
  replaced,   // another one is there
  putBack,    // it was gone, and has been put back
  lost        // it was gone, and could not be put back: the copy is all there is
};

// A copy of the settings file, made before a migration that discards or replaces the file: beside
// it, under the first free name "com.vantor.accountsettings.plist.before-migration-<n>" (n from 1),
// with mode 0600. A copy of the same content that is there already will do. The image outlives the
// object, and its lock is held.
class KeptSettings {
 public:
  explicit KeptSettings(const deviceimage::DeviceImage& image);

  // Why the settings file, which is there, could not be copied; empty when all is well.
  const std::string& error() const { return _error; }
  // The path of the copy; empty when there is none.
  std::string copy() const { return _copy.empty() ? _copy : _image.absolutePath(_copy); }
  // After the migration, whatever came of it. A file that is gone is put back as it was; the copy
  // of one that is there as before is removed, if this object made it.
  SettingsFate settle();

 private:
  void _keep();
  void _removeCopy();
  SettingsFate _putBack();

  const deviceimage::DeviceImage& _image;
  deviceimage::FileContent _content;  // of the settings file before
  struct stat _file = {};
  std::string _copy;          // its name; empty when there is none
  bool _wasMadeHere = false;  // and not found
  std::string _error;
};

// The copies that lie in the image, as whole paths in the order of their numbers.
std::vector<std::string> keptSettingsOf(const deviceimage::DeviceImage& image);

}  // namespace host
