// PosixFileServices::setAsideUnreadableFile: what a save is about to replace without having
// understood it stays beside it under another name, an aside.

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <memory>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <string_view>

#include "platform/posix/NumberedNames.h"
#include "platform/posix/PosixFileServices.h"
#include "platform/posix/SystemError.h"

namespace platform {
namespace {

constexpr std::string_view kMark = ".unreadable-";
// How often the directory is looked at when somebody else takes the name that was free.
constexpr int kAttempts = 8;
constexpr mode_t kPrivateMode = S_IRUSR | S_IWUSR;

using Buffer = std::array<std::uint8_t, 65536>;

bool isSameFile(const struct stat& a, const struct stat& b) {
  return a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

std::string asideName(const std::string& path, unsigned number) {
  return path + std::string(kMark) + std::to_string(number);
}

struct DirectoryCloser {
  void operator()(DIR* directory) const { ::closedir(directory); }
};

// The numbers of the asides of `path`, whoever made them. std::filesystem's iterator would end the
// process when memory runs out.
Status findAsides(const std::string& path, std::set<unsigned>& numbers) {
  const std::size_t slash = path.rfind('/');
  const std::string directory =
      slash == std::string::npos ? "." : path.substr(0, slash == 0 ? 1 : slash);
  const std::string prefix =
      path.substr(slash == std::string::npos ? 0 : slash + 1) + std::string(kMark);
  const std::unique_ptr<DIR, DirectoryCloser> entries(::opendir(directory.c_str()));
  if (entries == nullptr) return systemFailure(errno, "open", directory);
  errno = 0;
  while (const dirent* const entry = ::readdir(entries.get())) {
    if (const std::optional<unsigned> number = numberAfter(prefix, entry->d_name))
      numbers.insert(*number);
    errno = 0;
  }
  return errno == 0 ? Status::success() : systemFailure(errno, "read", directory);
}

// A file that is open for reading, if it can be: without waiting, following a link, or taking a
// terminal for this process's own.
class OpenedFile {
 public:
  explicit OpenedFile(const std::string& path)
      : _descriptor(
            ::open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC)),
        _errorNumber(_descriptor < 0 || ::fstat(_descriptor, &_status) != 0 ? errno : 0) {}
  OpenedFile(const OpenedFile&) = delete;
  OpenedFile& operator=(const OpenedFile&) = delete;
  ~OpenedFile() {
    if (_descriptor >= 0) ::close(_descriptor);
  }

  int errorNumber() const { return _errorNumber; }  // 0 when it is open
  const struct stat& status() const { return _status; }
  // As many bytes as there are and fit; fewer at the end of the file only. -1 for an error.
  ssize_t read(Buffer& buffer) const {
    std::size_t filled = 0;
    while (filled < buffer.size()) {
      const ssize_t count = ::read(_descriptor, buffer.data() + filled, buffer.size() - filled);
      if (count == 0) break;
      if (count < 0 && errno == EINTR) continue;
      if (count < 0) return -1;
      filled += static_cast<std::size_t>(count);
    }
    return static_cast<ssize_t>(filled);
  }

 private:
  struct stat _status = {};
  int _descriptor;
  int _errorNumber;
};

bool haveSameBytes(const OpenedFile& a, const OpenedFile& b) {
  Buffer left;
  Buffer right;
  for (;;) {
    const ssize_t count = a.read(left);
    if (count < 0 || b.read(right) != count) return false;
    const auto size = static_cast<std::size_t>(count);
    if (!std::equal(left.begin(), left.begin() + count, right.begin())) return false;
    if (size < left.size()) return true;
  }
}

// Whether the aside is as this service leaves one behind, and holds the bytes of the regular file
// at `path`. When in doubt it does not.
bool isCopy(const std::string& path, const struct stat& kept, const std::string& aside) {
  struct stat there = {};
  if (::lstat(aside.c_str(), &there) != 0 || !S_ISREG(there.st_mode)) return false;
  const bool isOurs = (there.st_mode & ALLPERMS) == kPrivateMode &&
                      (there.st_uid == kept.st_uid || there.st_uid == ::geteuid());
  if (!isOurs || there.st_size != kept.st_size) return false;
  const OpenedFile original(path);
  const OpenedFile copy(aside);
  return original.errorNumber() == 0 && copy.errorNumber() == 0 &&
         isSameFile(original.status(), kept) && isSameFile(copy.status(), there) &&
         haveSameBytes(original, copy);
}

Status copyContents(FileServices& files, const OpenedFile& from, int into) {
  Buffer buffer;
  for (;;) {
    const ssize_t count = from.read(buffer);
    if (count < 0) return systemFailure(errno, "read");
    const auto bytes = std::span(buffer).first(static_cast<std::size_t>(count));
    Status written = files.writeAll(into, bytes);
    if (!written.isSuccess()) return written;
    if (bytes.size() < buffer.size()) return files.synchronizeFile(into);
  }
}

// Copies the regular file at `path` to the new name `aside`. The owner is kept where this process
// may give files away: a copy made by the superuser must not become unreadable for the file's
// owner.
Status copyFile(FileServices& files, const std::string& path, const struct stat& kept,
                const std::string& aside) {
  const OpenedFile from(path);
  // A link is not opened, so it tells of a file that was replaced as another file does.
  if (from.errorNumber() == ELOOP || (from.errorNumber() == 0 && !isSameFile(from.status(), kept)))
    return Status::failure(EBUSY, "cannot keep " + path + ": it was replaced meanwhile");
  if (from.errorNumber() != 0) return systemFailure(from.errorNumber(), "open", path);
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

// Takes an aside that is a second name of the file from others' eyes. What is no regular file keeps
// its mode.
Status hideFromOthers(const struct stat& kept, const std::string& aside) {
  if (!S_ISREG(kept.st_mode) || (kept.st_mode & ALLPERMS) == kPrivateMode) return Status::success();
  if (::fchmodat(AT_FDCWD, aside.c_str(), kPrivateMode, AT_SYMLINK_NOFOLLOW) == 0)
    return Status::success();
  return systemFailure(errno, "change the mode of", aside);
}

// Makes the new name `aside` for what is at `path`.
Status makeAside(FileServices& files, const std::string& path, const struct stat& kept,
                 const std::string& aside) {
  const bool regular = S_ISREG(kept.st_mode);
  // A changed mode would show under the further names, which are not ours.
  if (regular && kept.st_nlink > 1) return copyFile(files, path, kept, aside);
  if (::linkat(AT_FDCWD, path.c_str(), AT_FDCWD, aside.c_str(), 0) != 0) {
    const int why = errno;
    if (!regular || why == EEXIST) return systemFailure(why, "link", path + " to " + aside);
    return copyFile(files, path, kept, aside);
  }
  Status hidden = hideFromOthers(kept, aside);
  if (!hidden.isSuccess()) files.removeFile(aside).ignore("the content is still at its first name");
  return hidden;
}

// All asides are looked at before a name is taken, because one behind a gap may be the right one.
Status keepFile(FileServices& files, const std::string& path, const struct stat& kept) {
  std::set<unsigned> numbers;
  Status found = findAsides(path, numbers);
  if (!found.isSuccess()) return found;
  for (const unsigned number : numbers) {
    const std::string aside = asideName(path, number);
    struct stat there = {};
    if (::lstat(aside.c_str(), &there) == 0 && isSameFile(there, kept))
      return hideFromOthers(kept, aside);
  }
  const bool isKept =
      S_ISREG(kept.st_mode) && std::any_of(numbers.begin(), numbers.end(), [&](unsigned number) {
        return isCopy(path, kept, asideName(path, number));
      });
  if (isKept) return Status::success();
  unsigned free = 1;
  while (numbers.contains(free)) ++free;
  return makeAside(files, path, kept, asideName(path, free));
}

}  // namespace

Status PosixFileServices::setAsideUnreadableFile(const std::string& path) {
  struct stat kept = {};
  if (::lstat(path.c_str(), &kept) != 0) {
    if (errno == ENOENT || errno == ENOTDIR) return Status::success();
    return systemFailure(errno, "examine", path);
  }
  if (S_ISDIR(kept.st_mode)) return systemFailure(EISDIR, "keep", path);
  Status outcome = keepFile(*this, path, kept);
  for (int attempt = 1; outcome.code == EEXIST && attempt < kAttempts; ++attempt)
    outcome = keepFile(*this, path, kept);
  return outcome.isSuccess() ? synchronizeDirectoryOfFile(path) : outcome;
}

}  // namespace platform
