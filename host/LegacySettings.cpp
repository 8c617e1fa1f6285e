#include "host/LegacySettings.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cstdint>

#include "deviceimage/Descriptor.h"
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

// Whether there is something at the name, or where it leads as a link: what the account settings
// library goes by.
bool leadsSomewhere(const DeviceImage& image, std::string_view file) {
  const DeviceImage::Parent parent = image.openParent(file);
  if (!parent.status.isSuccess()) return false;
  const deviceimage::Descriptor directory(parent.descriptor);
  struct stat status = {};
  return ::fstatat(directory.number(), parent.name.c_str(), &status, 0) == 0;
}

bool isOlder(const DeviceImage& image) {
  const auto version = image.readProperty(DeviceImage::kSettingsFile, "Version");
  return version && static_cast<std::uint64_t>(integerValue(&*version)) <
                        static_cast<std::uint64_t>(kPresentVersion);
}

}  // namespace

LegacyNeed legacyNeedOf(const DeviceImage& image) {
  LegacyNeed need;
  need.mailAccounts = leadsSomewhere(image, kMailAccounts);
  need.dataAccess = leadsSomewhere(image, kDataAccess);
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
