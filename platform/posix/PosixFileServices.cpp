#include "platform/posix/PosixFileServices.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <memory>

#include "platform/posix/SystemError.h"

namespace platform {

propertylist::FileReadResult PosixFileServices::readPropertyListFile(const std::string& path) {
  return _reading.readPropertyListFile(path);
}

bool PosixFileServices::fileExists(const std::string& path) {
  struct stat status = {};
  return ::stat(path.c_str(), &status) == 0;
}

std::optional<std::string> PosixFileServices::temporaryFileName() {
  // The name may be taken before it is used, which createPrivateFile notices.
  const std::unique_ptr<char, decltype(&std::free)> name(::tempnam(nullptr, nullptr), &std::free);
  if (name == nullptr) return std::nullopt;
  return name.get();
}

FileServices::Opened PosixFileServices::createPrivateFile(const std::string& path) {
  const int descriptor =
      ::open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR);
  if (descriptor < 0) return {systemFailure(errno, "create", path), -1};
  return {Status::success(), descriptor};
}

Status PosixFileServices::writeAll(int descriptor, std::span<const std::uint8_t> bytes) {
  while (!bytes.empty()) {
    const ssize_t written = ::write(descriptor, bytes.data(), bytes.size());
    if (written > 0)
      bytes = bytes.subspan(static_cast<std::size_t>(written));
    else if (written == 0)
      return systemFailure(EIO, "write");  // no progress and no reason: do not try for ever
    else if (errno != EINTR)
      return systemFailure(errno, "write");
  }
  return Status::success();
}

Status PosixFileServices::setOwner(int descriptor, uid_t user, gid_t group) {
  if (::fchown(descriptor, user, group) != 0) return systemFailure(errno, "change the owner");
  return Status::success();
}

Status PosixFileServices::makePrivate(int descriptor) {
  if (::fchmod(descriptor, S_IRUSR | S_IWUSR) != 0) return systemFailure(errno, "change the mode");
  return Status::success();
}

Status PosixFileServices::synchronizeFile(int descriptor) {
  if (::fsync(descriptor) != 0) return systemFailure(errno, "synchronize");
  return Status::success();
}

Status PosixFileServices::checkName(int descriptor, const std::string& path) {
  struct stat open = {};
  struct stat named = {};
  if (::fstat(descriptor, &open) != 0) return systemFailure(errno, "look at an open file");
  if (::lstat(path.c_str(), &named) != 0) return systemFailure(errno, "look at", path);
  if (open.st_dev != named.st_dev || open.st_ino != named.st_ino)
    return systemFailure(ESTALE, "find the open file at", path);
  return Status::success();
}

Status PosixFileServices::closeFile(int descriptor) {
  if (::close(descriptor) != 0) return systemFailure(errno, "close");
  return Status::success();
}

Status PosixFileServices::renameFileToFile(const std::string& from, const std::string& to) {
  if (std::rename(from.c_str(), to.c_str()) != 0)
    return systemFailure(errno, "rename", from + " to " + to);
  return Status::success();
}

Status PosixFileServices::synchronizeDirectoryOfFile(const std::string& path) {
  const std::size_t slash = path.rfind('/');
  const std::string directory =
      slash == std::string::npos ? "." : path.substr(0, slash == 0 ? 1 : slash);
  const int descriptor = ::open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (descriptor < 0) return systemFailure(errno, "open", directory);
  const Status synchronized = PosixFileServices::synchronizeFile(descriptor);
  const Status closed = PosixFileServices::closeFile(descriptor);
  return synchronized.isSuccess() ? closed : synchronized;
}

Status PosixFileServices::removeFile(const std::string& path) {
  if (::unlink(path.c_str()) != 0) return systemFailure(errno, "remove", path);
  return Status::success();
}

}  // namespace platform
