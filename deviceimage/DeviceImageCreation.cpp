// Making an image, its user database, and looking whether its files are as they must be.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <filesystem>
#include <system_error>

#include "deviceimage/Dataclass.h"
#include "deviceimage/Descriptor.h"
#include "deviceimage/DeviceImage.h"

namespace deviceimage {
namespace {

constexpr unsigned kUnprivilegedNumber = 501;  // "mobile" of an image that root makes
constexpr std::int64_t kSettingsVersion = 12;

std::span<const std::uint8_t> bytesOf(std::string_view text) {
  return {reinterpret_cast<const std::uint8_t*>(text.data()), text.size()};
}

std::string directoryOf(std::string_view relative) {
  return std::string(relative.substr(0, relative.rfind('/')));
}

std::vector<std::string> expectedDirectories() {
  std::vector<std::string> directories = {"etc",
                                          "var/run",
                                          std::string(DeviceImage::kLogDirectory),
                                          std::string(DeviceImage::kTemporaryDirectory),
                                          std::string(DeviceImage::kMigratorsDirectory),
                                          std::string(DeviceImage::kPreferencesDirectory),
                                          directoryOf(DeviceImage::kProcessDefaultsFile),
                                          directoryOf(DeviceImage::kRestrictionsFile)};
  for (const Dataclass dataclass : kDataclasses)
    directories.push_back(directoryOf(DeviceImage::databaseFile(syncTypeOf(dataclass))));
  return directories;
}

// The third field of the line that begins with `name`, in a file of lines of fields between colons.
// Empty when there is none or it is no number.
std::optional<unsigned> numberIn(const DeviceImage& image, std::string_view file,
                                 std::string_view name) {
  if (name.empty() || name.find(':') != std::string_view::npos) return std::nullopt;
  const OpenedFile opened = image.openFile(file, O_RDONLY);
  if (!opened.status.isSuccess()) return std::nullopt;
  const Descriptor descriptor(opened.descriptor);
  constexpr std::size_t kLargest = std::size_t{1} << 20U;
  std::string text;
  std::array<char, 4096> chunk{};
  for (ssize_t count = 1; count > 0 && text.size() < kLargest;) {
    count = ::read(descriptor.number(), chunk.data(), chunk.size());
    if (count < 0) return std::nullopt;
    text.append(chunk.data(), static_cast<std::size_t>(count));
  }
  std::string_view rest = text;
  while (!rest.empty()) {
    const std::string_view line = rest.substr(0, rest.find('\n'));
    rest.remove_prefix(std::min(rest.size(), line.size() + 1));
    const std::size_t second = line.find(':', std::min(line.size(), name.size() + 1));
    if (!line.starts_with(name) || line.size() <= name.size() || line[name.size()] != ':' ||
        second == std::string_view::npos)
      continue;
    const std::string_view digits =
        line.substr(second + 1, line.find(':', second + 1) - second - 1);
    unsigned number = 0;
    const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), number);
    if (error == std::errc() && end == digits.data() + digits.size() && !digits.empty())
      return number;
    return std::nullopt;
  }
  return std::nullopt;
}

void checkDirectory(const DeviceImage& image, const std::string& relative,
                    std::vector<ImageProblem>& problems) {
  struct stat status {};
  if (::lstat(image.absolutePath(relative).c_str(), &status) != 0)
    problems.push_back({relative, "is missing; make the directory with mode 0700"});
  else if (!S_ISDIR(status.st_mode))
    problems.push_back({relative, "is no directory; put a directory with mode 0700 in its place"});
}

// Everything below `relative` is a private file or directory.
void checkPrivacy(const DeviceImage& image, const std::string& relative,
                  std::vector<ImageProblem>& problems) {
  std::error_code error;
  const std::filesystem::path top = image.absolutePath(relative);
  for (std::filesystem::recursive_directory_iterator it(top, error), end; !error && it != end;
       it.increment(error)) {
    const std::string path = it->path().lexically_relative(image.rootPath()).string();
    struct stat status {};
    if (::lstat(it->path().c_str(), &status) != 0) continue;  // gone since it was listed
    if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode))
      problems.push_back({path, "is neither a file nor a directory; remove it"});
    else if ((status.st_mode & (S_IRWXG | S_IRWXO)) != 0)
      problems.push_back({path, "can be used by others than its owner; take away their rights"});
  }
  if (error) problems.push_back({relative, "cannot be listed: " + error.message()});
}

// Removes what is in the directory. False when something stays.
bool removeAllIn(const std::filesystem::path& directory) {
  std::error_code error;
  for (std::filesystem::directory_iterator it(directory, error), end; !error && it != end;
       it.increment(error)) {
    std::filesystem::remove_all(it->path(), error);
    if (error) return false;
  }
  return !error;
}

}  // namespace

OpenedImage DeviceImage::create(const std::string& path, const Completion& complete) {
  std::error_code error;
  const bool isNew = ::mkdir(path.c_str(), S_IRWXU) == 0;
  if (!isNew) {
    const int code = errno;
    if (code != EEXIST)
      return {nullptr, "cannot make the directory \"" + path +
                           "\": " + std::generic_category().message(code)};
    if (!std::filesystem::is_directory(path, error) || !std::filesystem::is_empty(path, error))
      return {nullptr, "\"" + path + "\" is there already; give a new name or an empty directory"};
  }
  const std::filesystem::path canonical = std::filesystem::canonical(path, error);
  Descriptor root(
      error ? -1 : ::open(canonical.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  struct stat before {};
  if (!root.isOpen() || ::fstat(root.number(), &before) != 0 ||
      ::fchmod(root.number(), S_IRWXU) != 0)
    return {nullptr,
            "cannot use the directory \"" + path + "\": " +
                (error ? error : std::error_code(errno, std::generic_category())).message()};
  std::shared_ptr<const DeviceImage> image(new DeviceImage(canonical.string(), root.release()));
  platform::Status status = image->_populate();
  if (status.isSuccess() && complete) status = complete(*image);
  if (status.isSuccess()) return {std::move(image), {}};
  const bool isRemoved = removeAllIn(canonical) && (!isNew || ::rmdir(canonical.c_str()) == 0);
  if (!isNew) ::chmod(canonical.c_str(), before.st_mode & 07777U);
  return {nullptr,
          status.error->description +
              (isRemoved ? "; nothing is left of the image" : "; remove \"" + path + "\"") +
              ", make room for it and try again",
          true};
}

platform::Status DeviceImage::_populate() const {
  const std::string user = std::to_string(::geteuid() == 0 ? kUnprivilegedNumber : ::geteuid());
  const std::string group = std::to_string(::geteuid() == 0 ? kUnprivilegedNumber : ::getegid());
  // The users come first: what follows below var/mobile is given to "mobile".
  platform::Status status = createFile(
      kUsersFile, bytesOf("root:*:0:0:System Administrator:/var/root:/bin/sh\nmobile:*:" + user +
                          ":" + group + ":Mobile User:/var/mobile:/bin/sh\n"));
  if (status.isSuccess())
    status = createFile(kGroupsFile, bytesOf("root:*:0:\nmobile:*:" + group + ":\n"));
  for (const std::string& directory : expectedDirectories())
    if (status.isSuccess()) status = makeDirectory(directory);
  using propertylist::Dictionary;
  const std::pair<std::string_view, Dictionary> kLists[] = {
      {kDevicePropertiesFile, {{"DeviceClass", "Kallo"}, {"CPUArchitecture", "armv7"}}},
      {kProcessDefaultsFile, {}},
      {kRestrictionsFile, {}},
      {kSettingsFile, {{"Version", kSettingsVersion}, {"Accounts", propertylist::Array()}}}};
  for (const auto& [name, content] : kLists)
    if (status.isSuccess()) status = writePropertyList(name, content);
  for (const std::string_view name : {kSystemLogFile, kNotificationsFile, kPreferenceChangesFile,
                                      kAccountChangesFile, kRefreshesFile, kLockFile})
    if (status.isSuccess()) status = createFile(name, {});
  return status;
}

std::optional<uid_t> DeviceImage::userNumber(std::string_view name) const {
  return numberIn(*this, kUsersFile, name);
}

std::optional<gid_t> DeviceImage::groupNumber(std::string_view name) const {
  return numberIn(*this, kGroupsFile, name);
}

std::vector<ImageProblem> DeviceImage::checkFiles() const {
  std::vector<ImageProblem> problems;
  for (const std::string& directory : expectedDirectories())
    checkDirectory(*this, directory, problems);
  if (!userNumber("mobile"))
    problems.push_back({std::string(kUsersFile), "has no line for the user \"mobile\"; add one"});
  if (!groupNumber("mobile"))
    problems.push_back({std::string(kGroupsFile), "has no line for the group \"mobile\"; add one"});
  for (const std::string_view directory : {kHomeDirectory, kLogDirectory, kTemporaryDirectory})
    checkPrivacy(*this, std::string(directory), problems);
  if (exists(kAccountServicesDirectory))  // an image may be without services
    checkPrivacy(*this, std::string(kAccountServicesDirectory), problems);
  for (const std::string_view name :
       {kSettingsFile, kDevicePropertiesFile, kProcessDefaultsFile, kRestrictionsFile}) {
    const propertylist::FileReadResult read = readPropertyList(name);
    if (read.exists && (!read.value || read.value->asDictionary() == nullptr))
      problems.push_back({std::string(name), read.value ? "holds no dictionary" : read.error});
  }
  return problems;
}

}  // namespace deviceimage
