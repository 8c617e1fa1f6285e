// A library for LD_PRELOAD that does what others who may write somewhere do at the worst moment.
//   MEDDLER_NAMES=A:B   the names that tempnam proposes, in turn; after the last one, its own
//   MEDDLER_LINK=PATH   the name of a file that is about to be given away becomes a link to PATH
//   MEDDLER_LATER=PATH  the same when its bytes are about to be brought to the disk
//   MEDDLER_GROW=PATH   the file grows by a MiB before each read of it, without end
//   MEDDLER_SWAP=A:B    A and B change places before each opening, so that no look at a path holds
//   MEDDLER_SWAP_AT=C   the same before each "rename", "unlink" or "fchown" (give one) and before
//                       no opening
//   MEDDLER_SWAPS=PATH  the file gets a byte for each time that they have changed places
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>

namespace {

template <typename Function>
Function* original(const char* name) {
  return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

std::string nameOf(int descriptor) {
  std::array<char, 4096> name = {};
  const std::string link = "/proc/self/fd/" + std::to_string(descriptor);
  const ssize_t size = readlink(link.c_str(), name.data(), name.size() - 1);
  return size > 0 ? std::string(name.data(), static_cast<std::size_t>(size)) : std::string();
}

}  // namespace

#define EXPORTED extern "C" __attribute__((visibility("default")))

EXPORTED char* tempnam(const char* directory, const char* prefix) {
  static const char* names = std::getenv("MEDDLER_NAMES");
  if (names == nullptr || *names == '\0')
    return original<decltype(tempnam)>("tempnam")(directory, prefix);
  const std::size_t size = std::strcspn(names, ":");
  char* const name = strndup(names, size);
  names += size + (names[size] == ':' ? 1 : 0);
  return name;
}

namespace {

void noteSwap() {
  static const char* const name = std::getenv("MEDDLER_SWAPS");
  if (name == nullptr) return;
  const int file = original<int(const char*, int, ...)>("open")(
      name, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600);
  if (file < 0 || write(file, "s", 1) != 1 || close(file) != 0) std::abort();
}

// At one of the calls, given by its name.
void swapPlacesAt(std::string_view call) {
  static const char* const swapped = std::getenv("MEDDLER_SWAP");
  static const char* const at = std::getenv("MEDDLER_SWAP_AT");
  if (swapped == nullptr || call != (at != nullptr ? at : "open")) return;
  const std::string both = swapped;
  const std::size_t colon = both.find(':');
  if (original<decltype(renameat2)>("renameat2")(AT_FDCWD, both.substr(0, colon).c_str(), AT_FDCWD,
                                                 both.substr(colon + 1).c_str(),
                                                 RENAME_EXCHANGE) != 0)
    std::abort();
  noteSwap();
}

void replaceByLink(int descriptor, const char* target) {
  if (target == nullptr) return;
  const std::string name = nameOf(descriptor);
  if (original<decltype(unlink)>("unlink")(name.c_str()) != 0 || symlink(target, name.c_str()) != 0)
    std::abort();
}

bool isRegular(int descriptor) {
  struct stat status = {};
  return fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
}

}  // namespace

EXPORTED int rename(const char* from, const char* to) noexcept {
  swapPlacesAt("rename");
  return original<decltype(rename)>("rename")(from, to);
}

EXPORTED int renameat2(int fromDirectory, const char* from, int toDirectory, const char* to,
                       unsigned flags) noexcept {
  swapPlacesAt("rename");
  return original<decltype(renameat2)>("renameat2")(fromDirectory, from, toDirectory, to, flags);
}

EXPORTED int unlink(const char* path) noexcept {
  swapPlacesAt("unlink");
  return original<decltype(unlink)>("unlink")(path);
}

EXPORTED int unlinkat(int directory, const char* path, int flags) noexcept {
  swapPlacesAt("unlink");
  return original<decltype(unlinkat)>("unlinkat")(directory, path, flags);
}

EXPORTED int fchown(int descriptor, uid_t user, gid_t group) noexcept {
  swapPlacesAt("fchown");
  replaceByLink(descriptor, std::getenv("MEDDLER_LINK"));
  return original<decltype(fchown)>("fchown")(descriptor, user, group);
}

EXPORTED int fsync(int descriptor) {
  if (isRegular(descriptor)) replaceByLink(descriptor, std::getenv("MEDDLER_LATER"));
  return original<decltype(fsync)>("fsync")(descriptor);
}

EXPORTED ssize_t read(int descriptor, void* buffer, std::size_t size) {
  const char* growing = std::getenv("MEDDLER_GROW");
  struct stat status = {};
  if (growing != nullptr && nameOf(descriptor) == growing && fstat(descriptor, &status) == 0 &&
      truncate(growing, status.st_size + (1 << 20)) != 0)
    std::abort();
  return original<decltype(read)>("read")(descriptor, buffer, size);
}

namespace {

mode_t modeAmong(int flags, __builtin_va_list& arguments) {
  return (flags & O_CREAT) != 0 ? __builtin_va_arg(arguments, mode_t) : 0;
}

}  // namespace

// SQLite takes those whose names end in 64.
#define EXPORTED_OPENAT(name)                                                              \
  EXPORTED int name(int directory, const char* path, int flags, ...) {                     \
    __builtin_va_list arguments;                                                           \
    __builtin_va_start(arguments, flags);                                                  \
    const mode_t mode = modeAmong(flags, arguments);                                       \
    __builtin_va_end(arguments);                                                           \
    swapPlacesAt("open");                                                                  \
    return original<int(int, const char*, int, ...)>(#name)(directory, path, flags, mode); \
  }
#define EXPORTED_OPEN(name)                                                \
  EXPORTED int name(const char* path, int flags, ...) {                    \
    __builtin_va_list arguments;                                           \
    __builtin_va_start(arguments, flags);                                  \
    const mode_t mode = modeAmong(flags, arguments);                       \
    __builtin_va_end(arguments);                                           \
    swapPlacesAt("open");                                                  \
    return original<int(const char*, int, ...)>(#name)(path, flags, mode); \
  }

// openat2 has no function of its own.
EXPORTED long syscall(long number, ...) noexcept {
  __builtin_va_list arguments;
  __builtin_va_start(arguments, number);
  std::array<long, 6> values = {};
  for (long& value : values) value = __builtin_va_arg(arguments, long);
  __builtin_va_end(arguments);
  if (number == SYS_openat2) swapPlacesAt("open");
  return original<long(long, ...)>("syscall")(number, values[0], values[1], values[2], values[3],
                                              values[4], values[5]);
}

EXPORTED_OPENAT(openat)
EXPORTED_OPENAT(openat64)
EXPORTED_OPEN(open)
EXPORTED_OPEN(open64)
