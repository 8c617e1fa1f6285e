#include "deviceimage/ImageLock.h"

#include <fcntl.h>
#include <sys/file.h>

#include <cerrno>
#include <system_error>

#include "deviceimage/Descriptor.h"

namespace deviceimage {
namespace {

class HeldLock : public platform::HeldFileLock {
 public:
  explicit HeldLock(Descriptor file) : _file(std::move(file)) {}
  // Also when a child process that was forked meanwhile has the open file too.
  void free() {
    if (_file.isOpen()) ::flock(_file.number(), LOCK_UN);
    _file.reset();
  }

 private:
  Descriptor _file;
};

}  // namespace

ImageLock::Attempt ImageLock::tryAcquire(const DeviceImage& image) {
  const OpenedFile opened = image.openFile(DeviceImage::kLockFile, O_RDWR | O_CREAT);
  if (!opened.status.isSuccess())
    return {Outcome::failed, nullptr, opened.status.error->description};
  Descriptor file(opened.descriptor);
  int result = 0;
  do result = ::flock(file.number(), LOCK_EX | LOCK_NB);
  while (result != 0 && errno == EINTR);
  if (result == 0)
    return {Outcome::held, std::unique_ptr<ImageLock>(new ImageLock(file.release())), {}};
  if (errno == EWOULDBLOCK)
    return {
        Outcome::heldByAnother, nullptr,
        "another run holds the device image \"" + image.rootPath() + "\"; wait until it has ended"};
  return {Outcome::failed, nullptr,
          "cannot lock the device image: " + std::generic_category().message(errno)};
}

ImageLock::~ImageLock() { ::close(_descriptor); }

ImageFileLocks::ImageFileLocks(std::shared_ptr<const DeviceImage> image)
    : _image(std::move(image)) {}

platform::HeldFileLockPtr ImageFileLocks::lockByName(std::string_view name) {
  if (name.find('/') != std::string_view::npos) return nullptr;
  const OpenedFile opened = _image->openFile(
      std::string(DeviceImage::kTemporaryDirectory) + "/" + std::string(name), O_RDWR | O_CREAT);
  if (!opened.status.isSuccess()) return nullptr;
  Descriptor file(opened.descriptor);
  int result = 0;
  do result = ::flock(file.number(), LOCK_EX);
  while (result != 0 && errno == EINTR);
  if (result != 0) return nullptr;
  return std::make_shared<HeldLock>(std::move(file));
}

void ImageFileLocks::unlock(const platform::HeldFileLockPtr& lock) {
  if (const auto held = std::dynamic_pointer_cast<HeldLock>(lock)) held->free();
}

}  // namespace deviceimage
