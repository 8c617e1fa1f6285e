#pragma once

#include "platform/FileServices.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingFileServices : public FileServices {
 public:
  explicit ForwardingFileServices(FileServices& next) : _next(next) {}

  propertylist::FileReadResult readPropertyListFile(const std::string& path) override {
    return _next.readPropertyListFile(path);
  }
  bool fileExists(const std::string& path) override { return _next.fileExists(path); }
  std::optional<std::string> temporaryFileName() override { return _next.temporaryFileName(); }
  Opened createPrivateFile(const std::string& path) override {
    return _next.createPrivateFile(path);
  }
  Status writeAll(int descriptor, std::span<const std::uint8_t> bytes) override {
    return _next.writeAll(descriptor, bytes);
  }
  Status setOwner(int descriptor, uid_t user, gid_t group) override {
    return _next.setOwner(descriptor, user, group);
  }
  Status makePrivate(int descriptor) override { return _next.makePrivate(descriptor); }
  Status synchronizeFile(int descriptor) override { return _next.synchronizeFile(descriptor); }
  Status checkName(int descriptor, const std::string& path) override {
    return _next.checkName(descriptor, path);
  }
  Status closeFile(int descriptor) override { return _next.closeFile(descriptor); }
  Status renameFileToFile(const std::string& from, const std::string& to) override {
    return _next.renameFileToFile(from, to);
  }
  Status synchronizeDirectoryOfFile(const std::string& path) override {
    return _next.synchronizeDirectoryOfFile(path);
  }
  Status removeFile(const std::string& path) override { return _next.removeFile(path); }
  Status setAsideUnreadableFile(const std::string& path) override {
    return _next.setAsideUnreadableFile(path);
  }

 private:
  FileServices& _next;
};

}  // namespace platform
