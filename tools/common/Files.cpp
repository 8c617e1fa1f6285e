#include "tools/common/Files.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <system_error>
#include <utility>

#include "tools/common/ExitCode.h"

namespace tools {
namespace {

std::string reason(int errorNumber) { return std::generic_category().message(errorNumber); }

[[noreturn]] void refuse(const std::string& path, const std::string& why) {
  throw CommandFailure(ExitCode::refused, fmt::format("{}: {}; nothing was written", path, why));
}

// A file descriptor that closes itself.
class Descriptor {
 public:
  explicit Descriptor(int number) : _number(number) {}
  ~Descriptor() {
    if (_number >= 0) ::close(_number);
  }
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  int number() const { return _number; }

 private:
  int _number;
};

// A file that root replaces in somebody's own folder stays that user's. Where others may write, as
// in /tmp, anybody could have put a file to be given the new one.
bool handToOwner(const std::string& path, int descriptor) {
  const std::filesystem::path folder = std::filesystem::path(path).parent_path();
  struct stat above {};
  struct stat status {};
  if (::geteuid() != 0 || ::lstat(path.c_str(), &status) != 0 || !S_ISREG(status.st_mode))
    return true;
  if (::stat(folder.empty() ? "." : folder.c_str(), &above) != 0) return false;
  if ((above.st_mode & (S_IWGRP | S_IWOTH)) != 0) return true;
  return ::fchown(descriptor, status.st_uid, status.st_gid) == 0;
}

}  // namespace

std::string readWholeFile(const std::string& path, std::size_t limit) {
  // Opening a pipe must not wait for a writer.
  const Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  if (file.number() < 0) refuse(path, reason(errno) + " (check its name and its rights)");
  struct stat status {};
  if (::fstat(file.number(), &status) != 0) refuse(path, reason(errno));
  if (!S_ISREG(status.st_mode)) refuse(path, "it is no regular file; give a file");
  std::string bytes;
  const std::size_t expected = static_cast<std::size_t>(status.st_size);
  for (;;) {
    if (bytes.size() > limit || expected > limit)
      refuse(path, fmt::format("it is larger than {} MiB; divide it", limit >> 20U));
    const std::size_t size = bytes.size();
    // One byte more than expected shows the end at the second read.
    bytes.resize(size < expected ? expected + 1 : size + 65'536);
    const ssize_t count = ::read(file.number(), bytes.data() + size, bytes.size() - size);
    if (count < 0 && errno != EINTR) refuse(path, reason(errno));
    bytes.resize(size + (count > 0 ? static_cast<std::size_t>(count) : 0));
    if (count == 0) return bytes;
  }
}

Output::Output(std::string path) : _path(std::move(path)) {
  if (_path.empty()) {
    _file = stdout;
    return;
  }
  _temporaryPath = _path + ".XXXXXX";
  const int descriptor = ::mkostemp(_temporaryPath.data(), O_CLOEXEC);  // mode 0600
  if (descriptor < 0) {
    const int errorNumber = errno;
    _temporaryPath.clear();
    refuse(_path, reason(errorNumber));
  }
  _file = ::fdopen(descriptor, "w");
  if (_file == nullptr) _fail(errno);
}

Output::~Output() {
  if (_file != nullptr && _file != stdout) std::fclose(_file);
  if (!_temporaryPath.empty()) ::unlink(_temporaryPath.c_str());
}

void Output::write(std::string_view bytes) {
  if (bytes.empty()) return;  // fwrite takes no null pointer
  if (std::fwrite(bytes.data(), 1, bytes.size(), _file) != bytes.size()) _fail(errno);
}

void Output::finish() {
  if (std::fflush(_file) != 0) _fail(errno);
  if (_file == stdout) return;
  if (!handToOwner(_path, ::fileno(_file))) _fail(errno);
  if (::fsync(::fileno(_file)) != 0) _fail(errno);
  if (std::fclose(std::exchange(_file, nullptr)) != 0) _fail(errno);
  if (::rename(_temporaryPath.c_str(), _path.c_str()) != 0) _fail(errno);
  _temporaryPath.clear();
}

void Output::_fail(int errorNumber) {
  throw CommandFailure(ExitCode::unexpectedFailure,
                       fmt::format("cannot write {}: {}; make room or give another --output",
                                   _path.empty() ? "standard output" : _path, reason(errorNumber)));
}

Progress::Progress() : _isTerminal(::isatty(STDERR_FILENO) == 1) {}

Progress::~Progress() { wipe(); }

void Progress::show(std::string_view text) {
  wipe();
  if (_isTerminal) std::fwrite(text.data(), 1, text.size(), stderr);
}

void Progress::wipe() {
  if (_isTerminal) std::fputs("\r\x1B[K", stderr);
}

}  // namespace tools
