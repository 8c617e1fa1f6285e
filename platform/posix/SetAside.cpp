// PosixFileServices::setAsideUnreadableFile: what a save is about to replace without having
// understood it stays beside it under another name.

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>

#include "platform/posix/PosixFileServices.h"
#include "platform/posix/SystemError.h"

namespace platform {
namespace {

constexpr int kMostCopies = 10000;

constexpr mode_t kPrivateMode = S_IRUSR | S_IWUSR;

bool isSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

// The first name beside `path` that is free or already names `kept`; empty when there are too many.
std::string nameForAside(const std::string& path, const struct stat& kept) {
  for (int n = 1; n <= kMostCopies; ++n) {
    const std::string name = path + ".unreadable-" + std::to_string(n);
    struct stat taken = {};
    if (::lstat(name.c_str(), &taken) != 0) return name;
    if (isSameFile(taken, kept)) return name;
  }
  return {};
}

Status copyContents(PosixFileServices& files, int from, int into) {
  std::array<std::uint8_t, 65536> buffer;
  for (;;) {
    const ssize_t count = ::read(from, buffer.data(), buffer.size());
    if (count == 0) return files.synchronizeFile(into);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return systemFailure(errno, "read");
    Status written = files.writeAll(into, std::span(buffer).first(static_cast<std::size_t>(count)));
    if (!written.isSuccess()) return written;
  }
}

// Copies the open regular file to the new name `aside`. The owner is kept where this process may
// give files away: a copy made by the superuser must not become unreadable for the file's owner.
Status copyOpenFile(PosixFileServices& files, int from, const struct stat& kept,
                    const std::string& aside) {
  const FileServices::Opened created = files.createPrivateFile(aside);
  if (!created.status.isSuccess()) return created.status;
  Status outcome = copyContents(files, from, created.descriptor);
  if (outcome.isSuccess() && ::geteuid() == 0)
    outcome = files.setOwner(created.descriptor, kept.st_uid, kept.st_gid);
  const Status closed = files.closeFile(created.descriptor);
  if (outcome.isSuccess()) outcome = closed;
  if (!outcome.isSuccess())
    files.removeFile(aside).ignore("the first failure is the one to report");
  return outcome;
}

Status copyFile(PosixFileServices& files, const std::string& path, const struct stat& kept,
                const std::string& aside) {
  // Opened without waiting, and compared with what was seen: the name may have been given to
  // something else meanwhile.
  const int from = ::open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC);
  if (from < 0) return systemFailure(errno, "open", path);
  struct stat opened = {};
  Status outcome = Status::success();
  if (::fstat(from, &opened) != 0)
    outcome = systemFailure(errno, "examine", path);
  else if (!isSameFile(opened, kept))
    outcome = systemFailure(EBUSY, "keep", path);
  else
    outcome = copyOpenFile(files, from, kept, aside);
  ::close(from);
  return outcome;
}

// Gives what is at `path` the second name `aside`.
Status linkFile(PosixFileServices& files, const std::string& path, const struct stat& kept,
                const std::string& aside) {
  const bool regular = S_ISREG(kept.st_mode);
  struct stat taken = {};
  if (::lstat(aside.c_str(), &taken) != 0) {
    // A changed mode would show under the further names, which are not ours.
    if (regular && kept.st_nlink > 1) return copyFile(files, path, kept, aside);
    if (::linkat(AT_FDCWD, path.c_str(), AT_FDCWD, aside.c_str(), 0) != 0) {
      if (!regular || errno == EEXIST) return systemFailure(errno, "link", path + " to " + aside);
      return copyFile(files, path, kept, aside);
    }
  }
  if (!regular || (kept.st_mode & ALLPERMS) == kPrivateMode) return Status::success();
  if (::fchmodat(AT_FDCWD, aside.c_str(), kPrivateMode, AT_SYMLINK_NOFOLLOW) == 0)
    return Status::success();
  Status failed = systemFailure(errno, "change the mode of", aside);
  files.removeFile(aside).ignore("the content is still at its first name");
  return failed;
}

}  // namespace

Status PosixFileServices::setAsideUnreadableFile(const std::string& path) {
  struct stat kept = {};
  if (::lstat(path.c_str(), &kept) != 0) {
    if (errno == ENOENT || errno == ENOTDIR) return Status::success();
    return systemFailure(errno, "examine", path);
  }
  if (S_ISDIR(kept.st_mode)) return systemFailure(EISDIR, "keep", path);
  const std::string aside = nameForAside(path, kept);
  if (aside.empty()) return systemFailure(EEXIST, "keep", path);
  PosixFileServices files;  // the inner steps are nobody's to override
  const Status outcome = linkFile(files, path, kept, aside);
  return outcome.isSuccess() ? files.synchronizeDirectoryOfFile(path) : outcome;
}

}  // namespace platform
