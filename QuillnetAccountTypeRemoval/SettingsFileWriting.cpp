#include "QuillnetAccountTypeRemoval/SettingsFileWriting.h"

#include <sys/types.h>

#include <cerrno>
#include <optional>

#include "platform/Services.h"
#include "propertylist/Writing.h"

namespace accountsettings {
namespace {

using platform::FileServices;

constexpr std::string_view kOwnerName = "mobile";
// How many names are tried when somebody else already took the one that was proposed.
constexpr int kNameAttempts = 8;

struct TemporaryFile {
  std::string path;
  int descriptor = -1;
};

std::optional<TemporaryFile> createTemporaryFile(FileServices& files) {
  for (int attempt = 0; attempt < kNameAttempts; ++attempt) {
    const std::optional<std::string> name = files.temporaryFileName();
    if (!name) return std::nullopt;
    const FileServices::Opened opened = files.createPrivateFile(*name);
    if (opened.status.isSuccess()) return TemporaryFile{*name, opened.descriptor};
    if (opened.status.code != EEXIST) return std::nullopt;
  }
  return std::nullopt;
}

// Fills the file, gives it to its owner and brings it to the disk, in this order. The descriptor is
// closed in every case.
bool completeTemporaryFile(FileServices& files, int descriptor, const propertylist::Bytes& bytes,
                           uid_t user, gid_t group) {
  const bool complete = files.writeAll(descriptor, bytes).isSuccess() &&
                        files.setOwner(descriptor, user, group).isSuccess() &&
                        files.makePrivate(descriptor).isSuccess() &&
                        files.synchronizeFile(descriptor).isSuccess();
  return files.closeFile(descriptor).isSuccess() && complete;
}

}  // namespace

bool writeSettingsFile(const propertylist::Dictionary& root, const std::string& target,
                       bool setAsideFirst) {
  const platform::Services& services = platform::services();
  FileServices& files = services.fileServices;
  const std::optional<propertylist::Bytes> bytes = propertylist::writeBinaryPropertyList(root);
  // Asked before anything is created: on a device without the account no save can succeed.
  const std::optional<uid_t> user = services.userDatabase.userIdentifierForName(kOwnerName);
  const std::optional<gid_t> group = services.userDatabase.groupIdentifierForName(kOwnerName);
  if (!bytes || !user || !group) return false;

  const std::optional<TemporaryFile> temporary = createTemporaryFile(files);
  if (!temporary) return false;
  const bool replaced =
      completeTemporaryFile(files, temporary->descriptor, *bytes, *user, *group) &&
      (!setAsideFirst || files.setAsideUnreadableFile(target).isSuccess()) &&
      files.renameFileToFile(temporary->path, target).isSuccess();
  if (!replaced) {
    files.removeFile(temporary->path).ignore("nothing more can be done about the leftover");
    return false;
  }
  files.synchronizeDirectoryOfFile(target).ignore("the new file is in place either way");
  return true;
}

}  // namespace accountsettings
