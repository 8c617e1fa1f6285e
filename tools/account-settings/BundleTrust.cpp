#include "tools/account-settings/BundleTrust.h"

#include <fmt/format.h>

#include <filesystem>
#include <system_error>

#include "host/BundleTrust.h"
#include "platform/DeviceInfo.h"
#include "tools/common/AccountCreators.h"
#include "tools/common/ExitCode.h"

namespace tools {
namespace {

namespace fs = std::filesystem;

constexpr host::TrustWords kTrustWords = {
    "the account service", "the user who runs account-settings",
    "put the account service itself there, with the rights to look at it"};

// With every folder above it.
void requireTrust(const std::string& path) {
  if (const auto reason = host::whyNotTrusted(path, kTrustWords))
    throw CommandFailure(ExitCode::refused,
                         fmt::format("--notify runs the code of the image's account services, and "
                                     "{} Nothing was changed; leave --notify out otherwise",
                                     *reason));
}

bool isMissing(const fs::path& path) {
  std::error_code error;
  return fs::symlink_status(path, error).type() == fs::file_type::not_found;
}

// Bundles may bring libraries of their own, so everything in the folder counts.
void requireTrustedFolder(const std::string& folder) {
  if (isMissing(folder)) return;
  requireTrust(folder);
  std::error_code error;
  fs::recursive_directory_iterator entry(folder, error);
  for (const fs::recursive_directory_iterator end; !error && entry != end; entry.increment(error))
    requireTrust(entry->path().string());
  if (error)
    throw CommandFailure(
        ExitCode::refused,
        fmt::format("{}: {}; nothing was changed; check its rights", folder, error.message()));
}

}  // namespace

void requireTrustedServices(const deviceimage::DeviceImage& image) {
  requireTrustedFolder(image.absolutePath(deviceimage::DeviceImage::kAccountServicesDirectory));
  for (const std::string& bundle : namedBundles()) {
    fs::path path = platform::joinedPath(image.rootPath(), bundle);
    // Where a bundle is missing, nobody else may be able to put one.
    while (isMissing(path)) path = path.parent_path();
    requireTrust(path.string());
  }
}

}  // namespace tools
