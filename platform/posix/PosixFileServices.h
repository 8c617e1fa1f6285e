#pragma once

#include "platform/FileServices.h"
#include "propertylist/Reading.h"

namespace platform {

// File services over the C library, for any system with POSIX files.
//
// temporaryFileName asks tempnam with neither directory nor prefix, so the names lie in the
// directory that the environment's TMPDIR names, or in /tmp when that does not exist. A call that a
// signal interrupts fails with EINTR; only writeAll goes on.
class PLATFORM_EXPORT PosixFileServices : public FileServices {
 public:
  propertylist::FileReadResult readPropertyListFile(const std::string& path) override;
  bool fileExists(const std::string& path) override;
  std::optional<std::string> temporaryFileName() override;
  Opened createPrivateFile(const std::string& path) override;
  Status writeAll(int descriptor, std::span<const std::uint8_t> bytes) override;
  Status setOwner(int descriptor, uid_t user, gid_t group) override;
  Status makePrivate(int descriptor) override;
  Status synchronizeFile(int descriptor) override;
  Status checkName(int descriptor, const std::string& path) override;
  Status closeFile(int descriptor) override;
  Status renameFileToFile(const std::string& from, const std::string& to) override;
  Status synchronizeDirectoryOfFile(const std::string& path) override;
  Status removeFile(const std::string& path) override;
  // A second name (hard link) for what is at `path`, which costs no space and cannot be half done;
  // so a file's mode becomes 0600 under both names, and stays so when `path` is not replaced after
  // all. Of a file that has further names already, or where the file system has no hard links, a
  // copy with the same owner, made by the other operations of this object. A link is kept as a
  // link, unfollowed, and a FIFO, socket or device as itself, with its mode. A directory fails with
  // EISDIR: no rename of a file replaces one. Nothing is kept again that any of the names keeps
  // already: the very file, or a private copy with the same bytes. A failure may leave a complete
  // aside behind, never a part of one.
  Status setAsideUnreadableFile(const std::string& path) override;

 private:
  propertylist::RepeatedReading _reading;  // a store reads the settings file many times
};

}  // namespace platform
