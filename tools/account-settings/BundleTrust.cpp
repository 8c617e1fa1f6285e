#include "tools/account-settings/BundleTrust.h"

#include <fmt/format.h>

#include <filesystem>
#include <optional>
#include <string>
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

void require(const std::optional<std::string>& reasonAgainst) {
  if (reasonAgainst)
    throw CommandFailure(ExitCode::refused,
                         fmt::format("--notify runs the code of the image's account services, and "
                                     "{} Nothing was changed; leave --notify out otherwise",
                                     *reasonAgainst));
}

bool isMissing(const fs::path& path) {
  std::error_code error;
  return fs::symlink_status(path, error).type() == fs::file_type::not_found;
}

}  // namespace

void requireTrustedServices(const deviceimage::DeviceImage& image) {
  const std::string services =
      image.absolutePath(deviceimage::DeviceImage::kAccountServicesDirectory);
  if (!isMissing(services)) require(host::whyFolderNotTrusted(services, kTrustWords));
  for (const std::string& bundle : namedBundles()) {
    fs::path path = platform::joinedPath(image.rootPath(), bundle);
    // Where a bundle is missing, nobody else may be able to put one.
    while (isMissing(path)) path = path.parent_path();
    require(host::whyNotTrusted(path.string(), kTrustWords));
  }
}

}  // namespace tools
