#pragma once

#include <memory>
#include <string>

#include "deviceimage/DeviceImage.h"
#include "platform/ExclusiveFileLock.h"

namespace deviceimage {

// The lock under which a program changes an image: one at a time. Advisory, and gone with the
// process that holds it, whatever ends it; a child made by fork shares it until it ends or runs
// another program. Programs that only look take none.
class ImageLock {
 public:
  enum class Outcome { held, heldByAnother, failed };
  struct Attempt {
    Outcome outcome = Outcome::failed;
    std::unique_ptr<ImageLock> lock;  // set when held
    std::string error;                // set when failed, or held by another run
  };
  // Tries once and does not wait.
  static Attempt tryAcquire(const DeviceImage& image);

  ~ImageLock();  // frees the lock; its file stays

  // The open file that holds the lock, for a program that is started to share it: the lock is free
  // when the last of its descriptors is closed.
  int descriptor() const { return _descriptor; }

  ImageLock(const ImageLock&) = delete;
  ImageLock& operator=(const ImageLock&) = delete;

 private:
  explicit ImageLock(int descriptor) : _descriptor(descriptor) {}
  int _descriptor;
};

// The device's named locks, as files in the image's tmp/ with the lock's name. Each lock object is
// an open file of its own, so that two in one process exclude each other too. The files are never
// removed, since a removed one would let two holders in; one that root makes belongs to "mobile",
// whose programs take the lock too. A name that is no plain file name, and a
// directory or link in the file's place, give no lock.
class ImageFileLocks : public platform::ExclusiveFileLock {
 public:
  explicit ImageFileLocks(std::shared_ptr<const DeviceImage> image);
  platform::HeldFileLockPtr lockByName(std::string_view name) override;
  void unlock(const platform::HeldFileLockPtr& lock) override;

 private:
  std::shared_ptr<const DeviceImage> _image;
};

}  // namespace deviceimage
