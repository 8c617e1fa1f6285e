#pragma once

#include <sys/types.h>

#include <optional>
#include <span>
#include <string>

#include "platform/Export.h"
#include "platform/Status.h"
#include "propertylist/Reading.h"
#include "propertylist/Value.h"

namespace platform {

// The file operations of loading and saving the settings, one system call each or nearly so, so
// that a test can let each of them fail. A failure's code is the errno. Any thread.
class PLATFORM_EXPORT FileServices {
 public:
  struct Opened {
    Status status;
    int descriptor = -1;  // the caller closes it with closeFile
  };

  virtual ~FileServices();

  // Reads the property list at `path`, as propertylist::readPropertyListFile does.
  virtual propertylist::FileReadResult readPropertyListFile(const std::string& path) = 0;
  // Whether something is at `path` (links are followed).
  virtual bool fileExists(const std::string& path) = 0;
  // A name for a temporary file in the process's default temporary directory. The name may be taken
  // by the time it is used; empty when none can be made.
  virtual std::optional<std::string> temporaryFileName() = 0;
  // Creates the file at `path`, readable and writable by its owner only. Fails with EEXIST when
  // anything is there already, a link included, and follows no link.
  virtual Opened createPrivateFile(const std::string& path) = 0;
  // Writes all of `bytes`, going on after a short write or an interruption.
  virtual Status writeAll(int descriptor, std::span<const std::uint8_t> bytes) = 0;
  virtual Status setOwner(int descriptor, uid_t user, gid_t group) = 0;
  // Makes the file readable and writable by its owner only.
  virtual Status makePrivate(int descriptor) = 0;
  // Waits until the file's content is on the disk. A failure is final: calling again proves
  // nothing.
  virtual Status synchronizeFile(int descriptor) = 0;
  // Fails with ESTALE when `path` names no longer the open file, because somebody who may write in
  // its directory put something else there. Links are not followed.
  virtual Status checkName(int descriptor, const std::string& path) = 0;
  // Closes the descriptor, also when it reports a failure.
  virtual Status closeFile(int descriptor) = 0;
  // Moves `from` over `to` in one step.
  virtual Status renameFileToFile(const std::string& from, const std::string& to) = 0;
  // Waits until the directory entry of `path` is on the disk.
  virtual Status synchronizeDirectoryOfFile(const std::string& path) = 0;
  virtual Status removeFile(const std::string& path) = 0;
  // Keeps what is at `path` under the first free name `path` + ".unreadable-" + n (n from 1), with
  // mode 0600; what such a name keeps already is not kept twice. What `path` names and its content
  // stay, whatever comes of it, but a service may make its mode 0600 too and give it further names.
  // Nothing that was there before is removed. Answers success without a copy when nothing is at
  // `path`.
  virtual Status setAsideUnreadableFile(const std::string& path) = 0;
};

}  // namespace platform
