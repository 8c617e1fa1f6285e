#include "platform/testing/JournaledFileServices.h"

namespace platform {

propertylist::FileReadResult JournaledFileServices::readPropertyListFile(const std::string& path) {
  const auto answer = _received("readPropertyListFile", {path});
  if (!answer) return PosixFileServices::readPropertyListFile(path);
  return {std::nullopt, PosixFileServices::fileExists(path),
          answer->status.error ? answer->status.error->description : "planned by the test"};
}

bool JournaledFileServices::fileExists(const std::string& path) {
  return !_fails("fileExists", {path}) && PosixFileServices::fileExists(path);
}

std::optional<std::string> JournaledFileServices::temporaryFileName() {
  if (_fails("temporaryFileName", {})) return std::nullopt;
  return PosixFileServices::temporaryFileName();
}

FileServices::Opened JournaledFileServices::createPrivateFile(const std::string& path) {
  const auto answer = _received("createPrivateFile", {path});
  if (answer && !answer->carriedOut) return {answer->status, -1};
  Opened created = PosixFileServices::createPrivateFile(path);
  if (!answer) return created;
  if (answer->status.isSuccess()) return {answer->status, created.descriptor};
  // The file is there, and nobody has it open.
  PosixFileServices::closeFile(created.descriptor).ignore("the test planned another status");
  return {answer->status, -1};
}

Status JournaledFileServices::writeAll(int descriptor, std::span<const std::uint8_t> bytes) {
  return _answered("writeAll", {std::to_string(bytes.size()) + " bytes"},
                   [&] { return PosixFileServices::writeAll(descriptor, bytes); });
}

Status JournaledFileServices::setOwner(int descriptor, uid_t user, gid_t group) {
  return _answered("setOwner", {std::to_string(user), std::to_string(group)},
                   [&] { return PosixFileServices::setOwner(descriptor, user, group); });
}

Status JournaledFileServices::makePrivate(int descriptor) {
  return _answered("makePrivate", {}, [&] { return PosixFileServices::makePrivate(descriptor); });
}

Status JournaledFileServices::synchronizeFile(int descriptor) {
  return _answered("synchronizeFile", {},
                   [&] { return PosixFileServices::synchronizeFile(descriptor); });
}

Status JournaledFileServices::checkName(int descriptor, const std::string& path) {
  return _answered("checkName", {path},
                   [&] { return PosixFileServices::checkName(descriptor, path); });
}

Status JournaledFileServices::closeFile(int descriptor) {
  const auto answer = _received("closeFile", {});
  Status closed = PosixFileServices::closeFile(descriptor);
  return answer ? answer->status : closed;
}

Status JournaledFileServices::renameFileToFile(const std::string& from, const std::string& to) {
  return _answered("renameFileToFile", {from, to},
                   [&] { return PosixFileServices::renameFileToFile(from, to); });
}

Status JournaledFileServices::synchronizeDirectoryOfFile(const std::string& path) {
  return _answered("synchronizeDirectoryOfFile", {path},
                   [&] { return PosixFileServices::synchronizeDirectoryOfFile(path); });
}

Status JournaledFileServices::removeFile(const std::string& path) {
  return _answered("removeFile", {path}, [&] { return PosixFileServices::removeFile(path); });
}

Status JournaledFileServices::setAsideUnreadableFile(const std::string& path) {
  return _answered("setAsideUnreadableFile", {path},
                   [&] { return PosixFileServices::setAsideUnreadableFile(path); });
}

}  // namespace platform
