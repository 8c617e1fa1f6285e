#include "QuillnetAccountTypeRemoval/SettingsFileWriting.h"

#include <sys/types.h>

#include <cerrno>
#include <memory>
#include <new>
#include <optional>
#include <utility>

#include "platform/Services.h"
#include "propertylist/Writing.h"

namespace accountsettings {
namespace {

using platform::FileServices;

constexpr std::string_view kOwnerName = "mobile";
// How many names are tried when somebody else already took the one that was proposed.
constexpr int kNameAttempts = 8;

// A new file that is removed when it goes, unless it was moved into place.
class TemporaryFile {
 public:
  TemporaryFile(FileServices& files, std::string path) : _files(files), _path(std::move(path)) {}
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;
  ~TemporaryFile() {
    try {
      if (_descriptor >= 0) close();
      if (_isThere) _files.removeFile(_path).ignore("nothing more can be done about the leftover");
    } catch (const std::bad_alloc&) {
      // What could not be removed for want of memory is swept at the host's next start.
    }
  }

  // Makes the file; 0, or the errno.
  int create() {
    const FileServices::Opened opened = _files.createPrivateFile(_path);
    _isThere = opened.status.isSuccess();
    if (_isThere) _descriptor = opened.descriptor;
    return opened.status.code;
  }
  // Fills the file, gives it to its owner and brings it to the disk, in this order. False also when
  // somebody put something else in its place meanwhile, which a rename would make the settings. The
  // descriptor is closed in every case.
  bool complete(const propertylist::Bytes& bytes, uid_t user, gid_t group) {
    const bool complete = _files.writeAll(_descriptor, bytes).isSuccess() &&
                          _files.setOwner(_descriptor, user, group).isSuccess() &&
                          _files.makePrivate(_descriptor).isSuccess() &&
                          _files.synchronizeFile(_descriptor).isSuccess();
    const bool isNamed = complete && _files.checkName(_descriptor, _path).isSuccess();
    return close() && isNamed;
  }
  bool moveTo(const std::string& target) {
    _isThere = !_files.renameFileToFile(_path, target).isSuccess();
    return !_isThere;
  }

 private:
  bool close() { return _files.closeFile(std::exchange(_descriptor, -1)).isSuccess(); }

  FileServices& _files;
  std::string _path;
  int _descriptor = -1;
  bool _isThere = false;
};

std::unique_ptr<TemporaryFile> createTemporaryFile(FileServices& files) {
  for (int attempt = 0; attempt < kNameAttempts; ++attempt) {
    std::optional<std::string> name = files.temporaryFileName();
    if (!name) return nullptr;
    // Before the file is there, so that it is never left behind for want of memory.
    auto file = std::make_unique<TemporaryFile>(files, std::move(*name));
    const int code = file->create();
    if (code == 0) return file;
    if (code != EEXIST) return nullptr;
  }
  return nullptr;
}

bool replaceSettingsFile(const propertylist::Dictionary& root, const std::string& target,
                         bool setAsideFirst) {
  const platform::Services& services = platform::services();
  FileServices& files = services.fileServices;
  const std::optional<propertylist::Bytes> bytes = propertylist::writeBinaryPropertyList(root);
  // Asked before anything is created: on a device without the account no save can succeed.
  const std::optional<uid_t> user = services.userDatabase.userIdentifierForName(kOwnerName);
  const std::optional<gid_t> group = services.userDatabase.groupIdentifierForName(kOwnerName);
  if (!bytes || !user || !group) return false;

  const std::unique_ptr<TemporaryFile> temporary = createTemporaryFile(files);
  return temporary && temporary->complete(*bytes, *user, *group) &&
         (!setAsideFirst || files.setAsideUnreadableFile(target).isSuccess()) &&
         temporary->moveTo(target);
}

}  // namespace

bool writeSettingsFile(const propertylist::Dictionary& root, const std::string& target,
                       bool setAsideFirst) {
  try {
    if (!replaceSettingsFile(root, target, setAsideFirst)) return false;
  } catch (const std::bad_alloc&) {
    return false;
  }
  try {
    platform::services().fileServices.synchronizeDirectoryOfFile(target).ignore(
        "the new file is in place either way");
  } catch (const std::bad_alloc&) {
    return true;  // as above
  }
  return true;
}

}  // namespace accountsettings
