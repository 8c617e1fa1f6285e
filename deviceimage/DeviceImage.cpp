#include "deviceimage/DeviceImage.h"

#include <dirent.h>
#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <system_error>

#include "deviceimage/Descriptor.h"

namespace deviceimage {
namespace {

constexpr int kDirectoryFlags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;

// The components of a name inside the image; empty when the name is refused.
std::vector<std::string> componentsOf(std::string_view relative) {
  std::vector<std::string> components;
  if (relative.starts_with('/')) relative.remove_prefix(1);
  while (true) {
    const std::size_t slash = relative.find('/');
    const std::string_view component = relative.substr(0, slash);
    if (component.empty() || component == "." || component == ".." ||
        component.find('\0') != std::string_view::npos)
      return {};
    components.emplace_back(component);
    if (slash == std::string_view::npos) return components;
    relative.remove_prefix(slash + 1);
  }
}

bool isBelow(std::string_view relative, std::string_view directory) {
  return relative.size() > directory.size() && relative.starts_with(directory) &&
         relative[directory.size()] == '/';
}

// Whether what is new there is the device's user's: a file in tmp/ may be a lock, which a program
// of that user takes tomorrow.
bool isOfMobile(std::string_view relative) {
  if (relative.starts_with('/')) relative.remove_prefix(1);
  return relative == DeviceImage::kHomeDirectory ||
         isBelow(relative, DeviceImage::kHomeDirectory) ||
         isBelow(relative, DeviceImage::kTemporaryDirectory);
}

// Opens the directory that the components but the last lead to, in one step and without following a
// link. -1 where the system cannot do that, and when the directory cannot be reached.
int openInOneStep(int root, const std::vector<std::string>& components) {
  std::string path = ".";
  for (std::size_t i = 0; i + 1 < components.size(); ++i) path.append("/").append(components[i]);
  open_how how = {};
  how.flags = kDirectoryFlags;
  how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS;
  return static_cast<int>(::syscall(SYS_openat2, root, path.c_str(), &how, sizeof how));
}

platform::Status failure(int code, std::string_view what, std::string_view relative) {
  return platform::Status::failure(code,
                                   std::string(what) + " \"" + std::string(relative) +
                                       "\" in the image: " + std::generic_category().message(code));
}

}  // namespace

DeviceImage::DeviceImage(std::string rootPath, int rootDescriptor)
    : _rootPath(std::move(rootPath)), _root(rootDescriptor) {}

DeviceImage::~DeviceImage() { ::close(_root); }

OpenedImage DeviceImage::open(const std::string& path) {
  std::error_code error;
  const std::filesystem::path canonical = std::filesystem::canonical(path, error);
  Descriptor root(error ? -1 : ::open(canonical.c_str(), kDirectoryFlags));
  if (!root.isOpen()) {
    const std::string reason = error ? error.message() : std::generic_category().message(errno);
    return {nullptr, "cannot open the device image \"" + path + "\": " + reason +
                         "; give the directory of an image"};
  }
  std::shared_ptr<const DeviceImage> image(new DeviceImage(canonical.string(), root.release()));
  if (!image->exists(kLibraryDirectory))
    return {nullptr, "\"" + path + "\" is no device image: it has no directory \"" +
                         std::string(kLibraryDirectory) +
                         "\"; make one with \"device-image create\""};
  return {std::move(image), {}};
}

std::string DeviceImage::absolutePath(std::string_view relative) const {
  if (relative.starts_with('/')) relative.remove_prefix(1);
  return (_rootPath == "/" ? "" : _rootPath) + "/" + std::string(relative);
}

std::string_view DeviceImage::databaseFile(platform::SyncDataType type) {
  switch (type) {
    case platform::SyncDataType::mailAccounts:
      return "var/mobile/Library/MailAccounts/MailAccounts.sqlite";
    case platform::SyncDataType::contacts:
      return "var/mobile/Library/Contacts/Contacts.sqlite";
    case platform::SyncDataType::calendars:
      return "var/mobile/Library/Calendars/Calendars.sqlite";
    case platform::SyncDataType::bookmarks:
      return "var/mobile/Library/Bookmarks/Bookmarks.sqlite";
    case platform::SyncDataType::notes:
      return "var/mobile/Library/Notes/Notes.sqlite";
  }
  std::abort();  // no other value exists
}

std::optional<std::string> DeviceImage::preferencesFile(std::string_view application) {
  constexpr std::size_t kLongestName = 200;  // with ".plist" below what file systems take
  if (application.empty() || application.size() > kLongestName || application.front() == '.' ||
      application.find('/') != std::string_view::npos ||
      application.find('\0') != std::string_view::npos)
    return std::nullopt;
  return std::string(kPreferencesDirectory) + "/" + std::string(application) + ".plist";
}

DeviceImage::Parent DeviceImage::_openParent(std::string_view relative, bool makeMissing) const {
  std::vector<std::string> components = componentsOf(relative);
  if (components.empty()) return {failure(EINVAL, "cannot use the name", relative), -1, {}};
  const int reached = openInOneStep(_root, components);
  if (reached >= 0) return {platform::Status::success(), reached, std::move(components.back())};
  // Step by step: which one fails says what is wrong, and what is missing may be made.
  Descriptor directory(::openat(_root, ".", kDirectoryFlags));
  if (!directory.isOpen()) return {failure(errno, "cannot reach", relative), -1, {}};
  std::string walked;
  for (std::size_t i = 0; i + 1 < components.size(); ++i) {
    const char* const component = components[i].c_str();
    walked.append(i == 0 ? "" : "/").append(components[i]);
    Descriptor next(::openat(directory.number(), component, kDirectoryFlags));
    if (!next.isOpen() && errno == ENOENT && makeMissing) {
      const bool isOurs = ::mkdirat(directory.number(), component, S_IRWXU) == 0;
      if (!isOurs && errno != EEXIST)
        return {failure(errno, "cannot make the directory", walked), -1, {}};
      next = Descriptor(::openat(directory.number(), component, kDirectoryFlags));
      if (isOurs && next.isOpen()) {
        platform::Status handedOver = _handOver(next.number(), walked);
        if (!handedOver.isSuccess()) return {std::move(handedOver), -1, {}};
      }
    }
    if (!next.isOpen()) return {failure(errno, "cannot reach", relative), -1, {}};
    directory = std::move(next);
  }
  return {platform::Status::success(), directory.release(), std::move(components.back())};
}

platform::Status DeviceImage::_handOver(int descriptor, std::string_view relative) const {
  if (::geteuid() != 0 || !isOfMobile(relative)) return platform::Status::success();
  const std::optional<uid_t> user = userNumber("mobile");
  const std::optional<gid_t> group = groupNumber("mobile");
  // Without a "mobile" there is nobody to give it to; the checks before a migration say so.
  if (!user || !group) return platform::Status::success();
  if (::fchown(descriptor, *user, *group) != 0)
    return failure(errno, "cannot give to user \"mobile\" the new", relative);
  return platform::Status::success();
}

OpenedFile DeviceImage::openFile(std::string_view relative, int flags) const {
  const bool mayCreate = (flags & O_CREAT) != 0;
  const Parent parent = _openParent(relative, mayCreate);
  if (!parent.status.isSuccess()) return {parent.status, -1};
  const Descriptor directory(parent.descriptor);
  const int always = O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK;
  Descriptor file;
  bool isNew = false;
  if (mayCreate) {
    file = Descriptor(::openat(directory.number(), parent.name.c_str(), flags | always | O_EXCL,
                               S_IRUSR | S_IWUSR));
    isNew = file.isOpen();
    if (!isNew && (errno != EEXIST || (flags & O_EXCL) != 0))
      return {failure(errno, "cannot create", relative), -1};
  }
  if (!isNew)
    file =
        Descriptor(::openat(directory.number(), parent.name.c_str(), (flags & ~O_CREAT) | always));
  if (!file.isOpen()) return {failure(errno, "cannot open", relative), -1};
  struct stat status {};
  if (::fstat(file.number(), &status) != 0) return {failure(errno, "cannot look at", relative), -1};
  if (!S_ISREG(status.st_mode)) return {failure(EINVAL, "no regular file is", relative), -1};
  if (isNew) {
    const platform::Status handedOver = _handOver(file.number(), relative);
    if (!handedOver.isSuccess()) return {handedOver, -1};
  }
  return {platform::Status::success(), file.release()};
}

platform::Status DeviceImage::makeDirectory(std::string_view relative) const {
  // The parent of something inside the directory is the directory itself.
  const Parent made = _openParent(std::string(relative) + "/x", true);
  if (made.descriptor >= 0) ::close(made.descriptor);
  return made.status;
}

FileLook DeviceImage::lookAt(std::string_view relative) const {
  using Kind = FileLook::Kind;
  const Parent parent = _openParent(relative, false);
  if (!parent.status.isSuccess())
    return {parent.status.code == ENOENT ? Kind::nothing : Kind::other, 0};
  const Descriptor directory(parent.descriptor);
  struct stat status {};
  if (::fstatat(directory.number(), parent.name.c_str(), &status, AT_SYMLINK_NOFOLLOW) != 0)
    return {errno == ENOENT ? Kind::nothing : Kind::other, 0};
  if (S_ISREG(status.st_mode)) return {Kind::file, status.st_size};
  if (!S_ISDIR(status.st_mode)) return {Kind::other, 0};
  return {Kind::directory, 0, (status.st_mode & (S_IWOTH | S_ISVTX)) == S_IWOTH};
}

bool DeviceImage::exists(std::string_view relative) const {
  const FileLook::Kind kind = lookAt(relative).kind;
  return kind == FileLook::Kind::file || kind == FileLook::Kind::directory;
}

std::vector<std::string> DeviceImage::namesIn(std::string_view relative) const {
  const Parent inside = _openParent(std::string(relative) + "/x", false);
  if (!inside.status.isSuccess()) return {};
  const std::unique_ptr<DIR, int (*)(DIR*)> directory(::fdopendir(inside.descriptor), ::closedir);
  if (directory == nullptr) {
    ::close(inside.descriptor);
    return {};
  }
  std::vector<std::string> names;
  while (const dirent* entry = ::readdir(directory.get())) {
    const std::string_view name = entry->d_name;
    if (name != "." && name != "..") names.emplace_back(name);
  }
  std::sort(names.begin(), names.end());
  return names;
}

platform::Status DeviceImage::removeFile(std::string_view relative) const {
  const Parent parent = _openParent(relative, false);
  if (!parent.status.isSuccess()) return parent.status;
  const Descriptor directory(parent.descriptor);
  if (::unlinkat(directory.number(), parent.name.c_str(), 0) != 0)
    return failure(errno, "cannot remove", relative);
  return platform::Status::success();
}

}  // namespace deviceimage
