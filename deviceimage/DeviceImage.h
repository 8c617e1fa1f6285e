#pragma once

#include <sys/types.h>

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Status.h"
#include "platform/SyncDataType.h"
#include "propertylist/Reading.h"
#include "propertylist/Value.h"

namespace deviceimage {

class DeviceImage;

// An image, or why there is none: one sentence that names the path and the remedy.
struct OpenedImage {
  std::shared_ptr<const DeviceImage> image;
  std::string error;  // empty exactly when there is an image
  // Only `create` says so: it had begun to write when it failed, and has removed what it had made.
  bool hadBegun = false;
};

// An open file of the image. The caller closes the descriptor; -1 on failure, whose code is the
// errno.
struct OpenedFile {
  platform::Status status;
  int descriptor = -1;
};

// What a file holds, or why that cannot be read.
struct FileContent {
  bool exists = false;
  std::optional<propertylist::Bytes> bytes;
  std::string error;  // empty exactly when there are bytes
};

// What is at a name of the image, seen without opening it.
struct FileLook {
  enum class Kind { nothing, file, directory, other };  // a link is "other", also on the way there
  Kind kind = Kind::nothing;
  std::int64_t size = 0;  // bytes, of a file
  // Whether everybody may put other things in the place of a directory's files: a mode that lets
  // others write, without the sticky bit.
  bool isOpenToOthers = false;
};

// Something about an image's files that stands in the way, and what to do about it.
struct ImageProblem {
  std::string path;  // relative to the image
  std::string text;  // one sentence
};

// A directory that mirrors the file system of a device. docs/device-image.md says what lies where.
//
// Names inside the image are relative ("var/mobile/Library"); a leading "/" is dropped. Every
// operation goes along such a name without following a link, so that nothing outside the image is
// read or written, whatever the image holds and whoever changes it meanwhile; a name with "..", an
// empty component or a NUL byte is refused with EINVAL, a link on the way with ELOOP or ENOTDIR.
// Directories are made with mode 0700, files with 0600. When root works on an image, what it makes
// under var/mobile and in tmp/ belongs to the image's user "mobile".
//
// The object holds the image's directory open. Any thread may use it.
class DeviceImage {
 public:
  // Opens the image at `path`: a directory with var/mobile/Library in it. Changes nothing.
  static OpenedImage open(const std::string& path);

  // Makes an image without accounts and records. `path` must not exist, or be an empty directory.
  // "mobile" is the user and group that calls this; for root, number 501. `complete` puts the last
  // things into the image. After a failure, also one of `complete`, `path` is as it was before.
  using Completion = std::function<platform::Status(const DeviceImage& image)>;
  static OpenedImage create(const std::string& path, const Completion& complete = {});

  ~DeviceImage();
  DeviceImage(const DeviceImage&) = delete;
  DeviceImage& operator=(const DeviceImage&) = delete;

  // Absolute, without links, and without a "/" at its end unless it is "/" itself.
  const std::string& rootPath() const { return _rootPath; }
  // `relative` below the root, for messages and for programs that need a whole path.
  std::string absolutePath(std::string_view relative) const;

  // Names inside the image.
  static constexpr std::string_view kHomeDirectory = "var/mobile";
  static constexpr std::string_view kLibraryDirectory = "var/mobile/Library";
  static constexpr std::string_view kPreferencesDirectory = "var/mobile/Library/Preferences";
  static constexpr std::string_view kSettingsFile =
      "var/mobile/Library/Preferences/com.vantor.accountsettings.plist";
  static constexpr std::string_view kMigratorsDirectory = "System/Library/DataClassMigrators";
  static constexpr std::string_view kAccountServicesDirectory = "System/Library/AccountServices";
  static constexpr std::string_view kTemporaryDirectory = "tmp";
  static constexpr std::string_view kUsersFile = "etc/passwd";
  static constexpr std::string_view kGroupsFile = "etc/group";
  static constexpr std::string_view kDevicePropertiesFile = "System/Library/DeviceProperties.plist";
  static constexpr std::string_view kProcessDefaultsFile =
      "var/mobile/Library/MigrationHost/Defaults.plist";
  static constexpr std::string_view kRestrictionsFile =
      "var/mobile/Library/ConfigurationProfiles/Restrictions.plist";
  static constexpr std::string_view kLogDirectory = "var/log";
  static constexpr std::string_view kSystemLogFile = "var/log/system.log";
  static constexpr std::string_view kNotificationsFile = "var/log/notifications.jsonl";
  static constexpr std::string_view kPreferenceChangesFile = "var/log/preference-changes.jsonl";
  static constexpr std::string_view kAccountChangesFile = "var/log/account-changes.jsonl";
  static constexpr std::string_view kRefreshesFile = "var/log/refreshes.jsonl";
  static constexpr std::string_view kLockFile = "var/run/image.lock";
  // The SQLite database of the type's records.
  static std::string_view databaseFile(platform::SyncDataType type);
  // The preferences of `application`; empty for a name that is no plain file name.
  static std::optional<std::string> preferencesFile(std::string_view application);

  // The same as whole paths, for those who hand them on.
  std::string settingsFile() const { return absolutePath(kSettingsFile); }
  std::string temporaryDirectory() const { return absolutePath(kTemporaryDirectory); }
  std::string preferencesDirectory() const { return absolutePath(kPreferencesDirectory); }
  std::string migratorsDirectory() const { return absolutePath(kMigratorsDirectory); }
  std::string systemLogFile() const { return absolutePath(kSystemLogFile); }
  std::string homeDirectory() const { return absolutePath(kHomeDirectory); }

  // Opens a regular file with the flags of open(2), to which O_NOFOLLOW, O_CLOEXEC and O_NONBLOCK
  // are added. With O_CREAT a new file has mode 0600 and its owner before anybody can write to it,
  // and missing directories are made. What is no regular file is refused.
  OpenedFile openFile(std::string_view relative, int flags) const;
  // Makes the directory with those above it; success when it is there.
  platform::Status makeDirectory(std::string_view relative) const;
  // The directory that holds `relative`, opened without following links, and the last component.
  // The caller closes the descriptor; -1 on failure.
  struct Parent {
    platform::Status status;
    int descriptor = -1;
    std::string name;
  };
  Parent openParent(std::string_view relative) const { return _openParent(relative, false); }
  FileLook lookAt(std::string_view relative) const;
  // Whether a file or directory is there; a link is not.
  bool exists(std::string_view relative) const;
  // The plain names in a directory, sorted; empty when it cannot be read.
  std::vector<std::string> namesIn(std::string_view relative) const;
  platform::Status removeFile(std::string_view relative) const;

  // The content of a file of 256 MiB at the most.
  FileContent readFile(std::string_view relative) const;
  // The property list in the file; limits and errors as propertylist::readPropertyListFile.
  propertylist::FileReadResult readPropertyList(std::string_view relative) const;
  // The value under `key` in the file's dictionary. What cannot be read counts as absent.
  std::optional<propertylist::Value> readProperty(std::string_view relative,
                                                  std::string_view key) const;
  // writeFile with the binary form of `value`; EINVAL when that form cannot hold it.
  platform::Status writePropertyList(std::string_view relative,
                                     const propertylist::Value& value) const;

  // Makes the file hold `bytes` in one step, lasting when it succeeds: a private file is written
  // beside it, synchronised and moved into place. writeFile replaces what is there, createFile
  // fails with EEXIST. A program that is killed meanwhile may leave the private file behind, which
  // removeLeftovers removes.
  platform::Status writeFile(std::string_view relative, std::span<const std::uint8_t> bytes) const;
  platform::Status createFile(std::string_view relative, std::span<const std::uint8_t> bytes) const;
  // Removes what killed programs left of writeFile and createFile. Only under the image's lock.
  void removeLeftovers() const;

  // The number of the user (group) with that name in the image's own etc/passwd (etc/group).
  std::optional<uid_t> userNumber(std::string_view name) const;
  std::optional<gid_t> groupNumber(std::string_view name) const;

  // What is wrong with the image's directories and files: missing ones, links, kinds and modes.
  // Looks, changes nothing. The databases' content is the matter of RecordStores::checkDatabases.
  std::vector<ImageProblem> checkFiles() const;

 private:
  DeviceImage(std::string rootPath, int rootDescriptor);
  Parent _openParent(std::string_view relative, bool makeMissing) const;
  // Gives what root has just made under var/mobile or in tmp/ to the image's user.
  platform::Status _handOver(int descriptor, std::string_view relative) const;
  platform::Status _populate() const;
  platform::Status _placeFile(std::string_view relative, std::span<const std::uint8_t> bytes,
                              bool mayReplace) const;

  std::string _rootPath;
  int _root;
};

}  // namespace deviceimage
