#pragma once

#include <sys/stat.h>

#include <map>
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

// Copies the settings file, before a migration that discards or replaces it: beside it, under the
// first free name "com.vantor.accountsettings.plist.before-migration-<n>" (n from 1), with mode
// 0600. A copy of the same content, with that mode and the right owner, that is there already will
// do; it becomes the newest one. Gives why the file, which is there, could not be copied; empty
// when all is well, also without a file.
std::string keepSettings(const deviceimage::DeviceImage& image);

// What becomes of the settings file and its copies over a migration. The image outlives the object,
// and its lock is held.
class KeptSettings {
 public:
  // Looks at what is there. `keepsNow`: and copies the file; else somebody else does it later.
  explicit KeptSettings(const deviceimage::DeviceImage& image, bool keepsNow = true);

  // What keepSettings gave.
  const std::string& error() const { return _error; }
  // After settle, the path of the copy that was made, or made the newest, since the object was
  // made; empty when there is none.
  std::string copy() const { return _copy.empty() ? _copy : _image.absolutePath(_copy); }
  // After the migration, whatever came of it. A file that is missing is put back from the newest
  // copy, also when it was missing before: a run that was killed may have left it so. The copy of
  // one that is put back, or is there as before, is removed when it was made since the object was.
  SettingsFate settle();

 private:
  void _findCopy();
  void _removeCopy();
  SettingsFate _putBack();

  const deviceimage::DeviceImage& _image;
  bool _existed = false;
  struct stat _file = {};
  std::map<std::string, timespec> _copiesBefore;  // when each was written, by name
  std::string _copy;                              // its name; empty when there is none
  std::string _error;
};

// The copies that lie in the image, as whole paths in the order of their numbers.
std::vector<std::string> keptSettingsOf(const deviceimage::DeviceImage& image);

}  // namespace host
