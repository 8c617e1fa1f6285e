// The files of an image as a whole: reading and replacing them.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <system_error>

#include "deviceimage/Dataclass.h"
#include "deviceimage/Descriptor.h"
#include "deviceimage/DeviceImage.h"
#include "propertylist/Writing.h"

namespace deviceimage {
namespace {

constexpr std::string_view kLeftoverPrefix = ".new-";

platform::Status failure(int code, std::string_view what, std::string_view relative) {
  return platform::Status::failure(code,
                                   "cannot " + std::string(what) + " \"" + std::string(relative) +
                                       "\" in the image: " + std::generic_category().message(code));
}

// 0 on success, else the errno.
int writeAll(int descriptor, std::span<const std::uint8_t> bytes) {
  while (!bytes.empty()) {
    const ssize_t written = ::write(descriptor, bytes.data(), bytes.size());
    if (written < 0 && errno == EINTR) continue;
    if (written <= 0) return written < 0 ? errno : EIO;
    bytes = bytes.subspan(static_cast<std::size_t>(written));
  }
  return 0;
}

}  // namespace

FileContent DeviceImage::readFile(std::string_view relative) const {
  const OpenedFile opened = openFile(relative, O_RDONLY);
  FileContent content;
  content.exists = opened.status.code != ENOENT;
  if (!opened.status.isSuccess()) {
    content.error = opened.status.error->description;
    return content;
  }
  const Descriptor file(opened.descriptor);
  propertylist::Bytes bytes;
  std::array<std::uint8_t, 65536> chunk{};
  while (true) {
    const ssize_t count = ::read(file.number(), chunk.data(), chunk.size());
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) {
      content.error = failure(errno, "read", relative).error->description;
      return content;
    }
    if (count == 0) break;
    bytes.insert(bytes.end(), chunk.data(), chunk.data() + count);
    if (bytes.size() > propertylist::kMaximumFileSize) {
      content.error = "\"" + std::string(relative) + "\" in the image is larger than 256 MiB";
      return content;
    }
  }
  content.bytes = std::move(bytes);
  return content;
}

propertylist::FileReadResult DeviceImage::readPropertyList(std::string_view relative) const {
  const FileContent content = readFile(relative);
  propertylist::FileReadResult result;
  result.exists = content.exists;
  result.error = content.error;
  if (!content.bytes) return result;
  propertylist::ReadResult read = propertylist::readPropertyList(*content.bytes);
  if (!read.value)
    result.error = "\"" + std::string(relative) +
                   "\" in the image is no property list: " + read.error.description();
  result.value = std::move(read.value);
  return result;
}

std::optional<propertylist::Value> DeviceImage::readProperty(std::string_view relative,
                                                             std::string_view key) const {
  const propertylist::FileReadResult read = readPropertyList(relative);
  const propertylist::Dictionary* const properties =
      read.value ? read.value->asDictionary() : nullptr;
  const propertylist::Value* const found = properties == nullptr ? nullptr : properties->find(key);
  return found == nullptr ? std::nullopt : std::optional<propertylist::Value>(*found);
}

platform::Status DeviceImage::writePropertyList(std::string_view relative,
                                                const propertylist::Value& value) const {
  const std::optional<propertylist::Bytes> bytes = propertylist::writeBinaryPropertyList(value);
  if (!bytes) return failure(EINVAL, "put this value into", relative);
  return writeFile(relative, *bytes);
}

platform::Status DeviceImage::writeFile(std::string_view relative,
                                        std::span<const std::uint8_t> bytes) const {
  return _placeFile(relative, bytes, true);
}

platform::Status DeviceImage::createFile(std::string_view relative,
                                         std::span<const std::uint8_t> bytes) const {
  return _placeFile(relative, bytes, false);
}

platform::Status DeviceImage::_placeFile(std::string_view relative,
                                         std::span<const std::uint8_t> bytes,
                                         bool mayReplace) const {
  const Parent parent = _openParent(relative, true);
  if (!parent.status.isSuccess()) return parent.status;
  const Descriptor directory(parent.descriptor);
  const std::string temporary =
      std::string(kLeftoverPrefix) + std::to_string(::getpid()) + "-" + parent.name;
  // What a killed program with our number left is nobody's any more.
  if (::unlinkat(directory.number(), temporary.c_str(), 0) != 0 && errno != ENOENT)
    return failure(errno, "write", relative);
  Descriptor file(::openat(directory.number(), temporary.c_str(),
                           O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC,
                           S_IRUSR | S_IWUSR));
  if (!file.isOpen()) return failure(errno, "write", relative);
  platform::Status status = _handOver(file.number(), relative);
  if (status.isSuccess()) {
    int code = writeAll(file.number(), bytes);
    if (code == 0 && ::fsync(file.number()) != 0) code = errno;
    if (::close(file.release()) != 0 && code == 0) code = errno;
    if (code == 0 && ::renameat2(directory.number(), temporary.c_str(), directory.number(),
                                 parent.name.c_str(), mayReplace ? 0 : RENAME_NOREPLACE) != 0)
      code = errno;
    if (code != 0) status = failure(code, "write", relative);
  }
  if (!status.isSuccess()) {
    ::unlinkat(directory.number(), temporary.c_str(), 0);
    return status;
  }
  if (::fsync(directory.number()) != 0) return failure(errno, "make lasting", relative);
  return platform::Status::success();
}

void DeviceImage::removeLeftovers() const {
  std::vector<std::string> directories = {std::string(kPreferencesDirectory)};
  for (const std::string_view name :
       {kDevicePropertiesFile, kProcessDefaultsFile, kRestrictionsFile, kUsersFile})
    directories.emplace_back(name.substr(0, name.rfind('/')));
  for (const Dataclass dataclass : kDataclasses) {
    const std::string_view name = databaseFile(syncTypeOf(dataclass));
    directories.emplace_back(name.substr(0, name.rfind('/')));
  }
  for (const std::string& directory : directories)
    for (const std::string& name : namesIn(directory))
      if (name.starts_with(kLeftoverPrefix))
        removeFile(directory + "/" + name).ignore("the next run tries again");
}

}  // namespace deviceimage
