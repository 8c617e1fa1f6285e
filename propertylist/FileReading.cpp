#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>

#include "propertylist/Reading.h"

namespace propertylist {
namespace {

// Closes the descriptor at the end of the block.
class Descriptor {
 public:
  explicit Descriptor(int number) : _number(number) {}
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  ~Descriptor() {
    if (_number >= 0) ::close(_number);
  }
  int number() const { return _number; }

 private:
  int _number;
};

int openForReading(const std::string& path) {
  int descriptor = -1;
  do {
    // A terminal at the path must not become this process's own.
    descriptor = ::open(path.c_str(), O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
  } while (descriptor < 0 && errno == EINTR);
  return descriptor;
}

// As many bytes as fit, 0 at the end of the file, -1 for an error.
ssize_t readOnce(int descriptor, std::span<std::uint8_t> buffer) {
  ssize_t count = -1;
  do {
    count = ::read(descriptor, buffer.data(), buffer.size());
  } while (count < 0 && errno == EINTR);
  return count;
}

std::string systemError(int number) { return std::system_category().message(number); }

// Why `path` could not be opened. The system gives one number for a link as its last part and for
// too many links before that.
std::string openingError(int number, const std::string& path) {
  struct stat status {};
  if (number != ELOOP) return systemError(number);
  return ::lstat(path.c_str(), &status) == 0 && S_ISLNK(status.st_mode)
             ? "a symbolic link, which is not followed"
             : "behind more symbolic links than are followed";
}

FileReadResult failure(bool exists, const std::string& path, const std::string& why) {
  return {std::nullopt, exists, path + ": " + why};
}

const std::string& tooLarge() {
  static const std::string text =
      "larger than the " + std::to_string(kMaximumFileSize >> 20U) + " MiB that are read";
  return text;
}

// The whole file, or why not. The file may grow or shrink meanwhile: `expectedSize` is a first
// guess.
std::string readAll(int descriptor, std::size_t expectedSize, Bytes& bytes) {
  std::size_t filled = 0;
  bytes.resize(expectedSize + 1);  // the end of the file shows without a second allocation
  while (true) {
    const ssize_t count = readOnce(descriptor, std::span(bytes).subspan(filled));
    if (count < 0) return systemError(errno);
    if (count == 0) break;
    filled += static_cast<std::size_t>(count);
    if (filled > kMaximumFileSize) return tooLarge();
    if (filled == bytes.size()) bytes.resize(bytes.size() * 2);
  }
  bytes.resize(filled);
  return {};
}

// The bytes of the file, or why there are none.
FileReadResult readBytes(const std::string& path, Bytes& bytes) {
  // A NUL would cut the path short, and another file would be read.
  if (path.find('\0') != std::string::npos) return failure(false, path, systemError(EINVAL));
  const Descriptor file(openForReading(path));
  if (file.number() < 0) {
    const int why = errno;
    const bool exists = why != ENOENT && why != ENOTDIR;
    return failure(exists, path, openingError(why, path));
  }
  struct stat status {};
  if (::fstat(file.number(), &status) != 0) return failure(true, path, systemError(errno));
  if (!S_ISREG(status.st_mode)) return failure(true, path, "not a regular file");
  if (status.st_size > static_cast<off_t>(kMaximumFileSize)) return failure(true, path, tooLarge());
  const std::string problem =
      readAll(file.number(), static_cast<std::size_t>(status.st_size), bytes);
  if (!problem.empty()) return failure(true, path, problem);
  return {std::nullopt, true, {}};
}

FileReadResult valueOf(const std::string& path, const Bytes& bytes) {
  ReadResult result = readPropertyList(bytes);
  if (!result.value) return failure(true, path, result.error.description());
  return {std::move(result.value), true, {}};
}

}  // namespace

FileReadResult readPropertyListFile(const std::string& path) {
  Bytes bytes;
  FileReadResult result = readBytes(path, bytes);
  return result.error.empty() ? valueOf(path, bytes) : result;
}

FileReadResult RepeatedReading::readPropertyListFile(const std::string& path) {
  Bytes bytes;
  FileReadResult result = readBytes(path, bytes);
  if (!result.error.empty()) return result;
  const std::lock_guard lock(_lock);
  if (_value && bytes == _bytes) return {_value, true, {}};
  result = valueOf(path, bytes);
  if (result.value && bytes.size() <= kMaximumKeptSize) {
    _bytes = std::move(bytes);
    _value = result.value;
  }
  return result;
}

}  // namespace propertylist
