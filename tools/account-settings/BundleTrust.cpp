#include "tools/account-settings/BundleTrust.h"

#include <fmt/format.h>

#include <filesystem>
#include <system_error>

#include "host/BundleTrust.h"
#include "tools/common/ExitCode.h"

namespace tools {
namespace {

void requireTrust(const std::string& path) {
  if (const auto reason = host::whyNotTrusted(path))
    throw CommandFailure(ExitCode::refused,
                         fmt::format("--notify runs the code of the image's account services, and "
                                     "{} Nothing was changed; leave --notify out otherwise",
                                     *reason));
}

}  // namespace

void requireTrustedServices(const deviceimage::DeviceImage& image) {
  namespace fs = std::filesystem;
  const std::string services =
      image.absolutePath(deviceimage::DeviceImage::kAccountServicesDirectory);
  std::error_code error;
  if (fs::symlink_status(services, error).type() == fs::file_type::not_found) return;
  requireTrust(services);  // and every folder above it
  fs::recursive_directory_iterator entry(services, error);
  for (const fs::recursive_directory_iterator end; !error && entry != end; entry.increment(error))
    requireTrust(entry->path().string());
  if (error)
    throw CommandFailure(
        ExitCode::refused,
        fmt::format("{}: {}; nothing was changed; check its rights", services, error.message()));
}

}  // namespace tools
