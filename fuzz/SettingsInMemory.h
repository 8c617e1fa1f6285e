#pragma once

#include <cerrno>
#include <optional>
#include <string>

#include "platform/FileServices.h"

namespace fuzz {

// The files of loading and saving as far as a fuzzer needs them: one settings file and one
// temporary file, as bytes. Nothing fails.
class SettingsInMemory final : public platform::FileServices {
 public:
  propertylist::Bytes settings;
  int savesCount = 0;
  int setAsideCount = 0;

  propertylist::FileReadResult readPropertyListFile(const std::string& /*path*/) override {
    propertylist::ReadResult read = propertylist::readPropertyList(settings);
    return {std::move(read.value), true, read.error.what};
  }
  bool fileExists(const std::string& /*path*/) override { return true; }
  std::optional<std::string> temporaryFileName() override { return "temporary"; }
  Opened createPrivateFile(const std::string& /*path*/) override {
    _temporary.clear();
    return {platform::Status::success(), 3};
  }
  platform::Status writeAll(int /*descriptor*/, std::span<const std::uint8_t> bytes) override {
    _temporary.assign(bytes.begin(), bytes.end());
    return platform::Status::success();
  }
  platform::Status setOwner(int /*descriptor*/, uid_t /*user*/, gid_t /*group*/) override {
    return platform::Status::success();
  }
  platform::Status makePrivate(int /*descriptor*/) override { return platform::Status::success(); }
  platform::Status synchronizeFile(int /*descriptor*/) override {
    return platform::Status::success();
  }
  platform::Status checkName(int /*descriptor*/, const std::string& /*path*/) override {
    return platform::Status::success();
  }
  platform::Status closeFile(int /*descriptor*/) override { return platform::Status::success(); }
  platform::Status renameFileToFile(const std::string& /*from*/,
                                    const std::string& /*to*/) override {
    settings = _temporary;
    ++savesCount;
    return platform::Status::success();
  }
  platform::Status synchronizeDirectoryOfFile(const std::string& /*path*/) override {
    return platform::Status::success();
  }
  platform::Status removeFile(const std::string& /*path*/) override {
    return platform::Status::success();
  }
  platform::Status setAsideUnreadableFile(const std::string& /*path*/) override {
    ++setAsideCount;
    return platform::Status::success();
  }

 private:
  propertylist::Bytes _temporary;
};

}  // namespace fuzz
