#pragma once

#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "deviceimage/DeviceImage.h"
#include "platform/posix/PosixFileServices.h"

namespace deviceimage {

// The file services of a process that works on an image. A path below the image's directory is
// walked one component at a time and no link in it is followed, so that nothing outside the image
// is read or written even when somebody puts a link in a directory's place meanwhile; a link on the
// way fails with ENOTDIR, a name that the image does not take with EINVAL. Paths elsewhere, such as
// those of a bundle's resources, are taken as they are. Only fileExists looks where a link as the
// last component leads. The directory of a file that createPrivateFile has made stays open until
// the file is moved or removed, which can then not fail for want of a descriptor. Any thread.
class ImageFileServices final : public platform::PosixFileServices {
 public:
  explicit ImageFileServices(std::shared_ptr<const DeviceImage> image);

  propertylist::FileReadResult readPropertyListFile(const std::string& path) override;
  bool fileExists(const std::string& path) override;
  Opened createPrivateFile(const std::string& path) override;
  platform::Status checkName(int descriptor, const std::string& path) override;
  platform::Status renameFileToFile(const std::string& from, const std::string& to) override;
  platform::Status synchronizeDirectoryOfFile(const std::string& path) override;
  platform::Status removeFile(const std::string& path) override;
  platform::Status setAsideUnreadableFile(const std::string& path) override;

 private:
  class Reached;
  using ReachedPtr = std::shared_ptr<const Reached>;
  ReachedPtr _reach(const std::string& path);
  using Operation = std::function<platform::Status(const std::string& path)>;
  platform::Status _withReached(const std::string& path, const Operation& operation);
  void _letGo(const std::string& path);

  std::shared_ptr<const DeviceImage> _image;
  std::mutex _mutex;  // of what follows
  std::map<std::string, ReachedPtr> _begun;
};

}  // namespace deviceimage
