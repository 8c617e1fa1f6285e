#pragma once

#include <set>

#include "platform/posix/PosixFileServices.h"
#include "platform/testing/FakeService.h"

namespace platform {

// The real file services, with a journal and calls that fail. A planned failure without
// `carriedOut` leaves the files as they are; a close that fails closes all the same. A creation
// that is carried out and fails leaves the file behind, closed. The steps of setAsideUnreadableFile
// are calls of their own.
class JournaledFileServices : public PosixFileServices, public FakeService {
 public:
  propertylist::FileReadResult readPropertyListFile(const std::string& path) override;
  bool fileExists(const std::string& path) override;
  std::optional<std::string> temporaryFileName() override;
  Opened createPrivateFile(const std::string& path) override;
  Status writeAll(int descriptor, std::span<const std::uint8_t> bytes) override;
  Status setOwner(int descriptor, uid_t user, gid_t group) override;
  Status makePrivate(int descriptor) override;
  Status synchronizeFile(int descriptor) override;
  Status checkName(int descriptor, const std::string& path) override;
  Status closeFile(int descriptor) override;
  Status renameFileToFile(const std::string& from, const std::string& to) override;
  Status synchronizeDirectoryOfFile(const std::string& path) override;
  Status removeFile(const std::string& path) override;
  Status setAsideUnreadableFile(const std::string& path) override;
};

}  // namespace platform
