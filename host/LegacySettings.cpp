#include "host/LegacySettings.h"

#include <cstdint>

#include "host/BundleTrust.h"
#include "host/Settings.h"

namespace host {
namespace {

using deviceimage::DeviceImage;
using deviceimage::FileLook;

constexpr std::string_view kMailAccounts = "var/mobile/Library/Mail/Accounts.plist";
constexpr std::string_view kDataAccess =
    "var/mobile/Library/Preferences/com.vantor.DataAccess.plist";
constexpr TrustWords kTrustWords = {"the accounts data migrator", "the user who runs the migration",
                                    "put the accounts data migrator there again"};

bool isThere(const DeviceImage& image, std::string_view file) {
  return image.lookAt(file).kind != FileLook::Kind::nothing;
}

bool isOlder(const DeviceImage& image) {
  const auto version = image.readProperty(DeviceImage::kSettingsFile, "Version");
  return version && static_cast<std::uint64_t>(integerValue(&*version)) <
                        static_cast<std::uint64_t>(kPresentVersion);
}

}  // namespace

LegacyNeed legacyNeedOf(const DeviceImage& image) {
  LegacyNeed need;
  need.mailAccounts = isThere(image, kMailAccounts);
  need.dataAccess = isThere(image, kDataAccess);
  need.olderVersion = !need.mailAccounts && !need.dataAccess && isOlder(image);
  return need;
}

std::vector<std::string> reasonsAgainstAccountMigrator(const DeviceImage& image) {
  const std::string path = image.absolutePath(kAccountMigrator);
  if (!isThere(image, kAccountMigrator))
    return {path +
            " is missing, which makes the settings file of what older systems left; put the "
            "accounts data migrator there, as device-image create does."};
  if (auto reason = whyFolderNotTrusted(path, kTrustWords)) return {std::move(*reason)};
  return {};
}

}  // namespace host
