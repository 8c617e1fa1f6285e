#include "deviceimage/ImageFileServices.h"

#include <cerrno>
#include <string_view>
#include <utility>

#include "deviceimage/Descriptor.h"

namespace deviceimage {

using platform::Status;

// A path whose directory is held open: `path` names the same entry whatever becomes of the names
// above it.
class ImageFileServices::Reached {
 public:
  Reached(const DeviceImage& image, const std::string& asked) : path(asked) {
    const std::string root = image.absolutePath("");
    if (!asked.starts_with(root)) return;
    DeviceImage::Parent parent = image.openParent(std::string_view(asked).substr(root.size()));
    status = std::move(parent.status);
    if (!status.isSuccess()) return;
    _directory = Descriptor(parent.descriptor);
    _name = asked.substr(0, asked.size() - parent.name.size() - 1);
    _held = "/proc/self/fd/" + std::to_string(_directory.number());
    path = _held + "/" + parent.name;
  }

  // A message with the path as it was asked for.
  std::string told(std::string text) const {
    for (std::size_t at = 0; !_held.empty() && (at = text.find(_held, at)) != std::string::npos;
         at += _name.size())
      text.replace(at, _held.size(), _name);
    return text;
  }
  Status told(Status outcome) const {
    if (!outcome.error) return outcome;
    return Status::failure(outcome.code, told(outcome.error->description));
  }

  bool isInImage() const { return !_held.empty(); }

  Status status;
  std::string path;

 private:
  Descriptor _directory;
  std::string _name;  // of the directory
  std::string _held;  // another name of it; empty for a path outside the image
};

ImageFileServices::ImageFileServices(std::shared_ptr<const DeviceImage> image)
    : _image(std::move(image)) {}

ImageFileServices::ReachedPtr ImageFileServices::_reach(const std::string& path) {
  {
    const std::lock_guard guard(_mutex);
    const auto begun = _begun.find(path);
    if (begun != _begun.end()) return begun->second;
  }
  return std::make_shared<const Reached>(*_image, path);
}

void ImageFileServices::_letGo(const std::string& path) {
  const std::lock_guard guard(_mutex);
  _begun.erase(path);
}

Status ImageFileServices::_withReached(const std::string& path, const Operation& operation) {
  const ReachedPtr reached = _reach(path);
  return reached->status.isSuccess() ? reached->told(operation(reached->path)) : reached->status;
}

propertylist::FileReadResult ImageFileServices::readPropertyListFile(const std::string& path) {
  const ReachedPtr reached = _reach(path);
  if (!reached->status.isSuccess())
    return {std::nullopt, reached->status.code != ENOENT, reached->status.error->description};
  propertylist::FileReadResult read = PosixFileServices::readPropertyListFile(reached->path);
  read.error = reached->told(std::move(read.error));
  return read;
}

bool ImageFileServices::fileExists(const std::string& path) {
  const ReachedPtr reached = _reach(path);
  return reached->status.isSuccess() && PosixFileServices::fileExists(reached->path);
}

platform::FileServices::Opened ImageFileServices::createPrivateFile(const std::string& path) {
  const ReachedPtr reached = _reach(path);
  if (!reached->status.isSuccess()) return {reached->status, -1};
  if (!reached->isInImage()) return PosixFileServices::createPrivateFile(path);
  {
    // First, so that no file is made that its maker never hears of, for want of memory.
    const std::lock_guard guard(_mutex);
    _begun[path] = reached;
  }
  Opened opened = PosixFileServices::createPrivateFile(reached->path);
  if (!opened.status.isSuccess()) {
    _letGo(path);
    opened.status = reached->told(std::move(opened.status));
  }
  return opened;
}

Status ImageFileServices::checkName(int descriptor, const std::string& path) {
  return _withReached(path, [&](const std::string& reached) {
    return PosixFileServices::checkName(descriptor, reached);
  });
}

Status ImageFileServices::renameFileToFile(const std::string& from, const std::string& to) {
  Status outcome = _withReached(from, [&](const std::string& reachedFrom) {
    return _withReached(to, [&](const std::string& reachedTo) {
      return PosixFileServices::renameFileToFile(reachedFrom, reachedTo);
    });
  });
  if (outcome.isSuccess()) _letGo(from);
  return outcome;
}

Status ImageFileServices::synchronizeDirectoryOfFile(const std::string& path) {
  return _withReached(path, [&](const std::string& reached) {
    return PosixFileServices::synchronizeDirectoryOfFile(reached);
  });
}

Status ImageFileServices::removeFile(const std::string& path) {
  Status outcome = _withReached(
      path, [&](const std::string& reached) { return PosixFileServices::removeFile(reached); });
  _letGo(path);
  return outcome;
}

Status ImageFileServices::setAsideUnreadableFile(const std::string& path) {
  return _withReached(path, [&](const std::string& reached) {
    return PosixFileServices::setAsideUnreadableFile(reached);
  });
}

}  // namespace deviceimage
