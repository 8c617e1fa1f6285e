#include "host/StartChecks.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <set>
#include <string_view>
#include <system_error>

namespace host {
namespace {

using deviceimage::DeviceImage;
using Reasons = std::vector<std::string>;

constexpr std::string_view kMobile = "mobile";
// Enough to see what is wrong; the settings may hold very many accounts.
constexpr std::size_t kMaximumAccountReasons = 10;

void checkSettings(const DeviceImage& image, const Settings& settings, Reasons& reasons) {
  if (!settings.error.empty())
    reasons.push_back(
        image.settingsFile() + " cannot be read: " + settings.error +
        "; bring back a readable copy, or move the file away if its accounts may go.");
  if (settings.strangeEntries > 0)
    reasons.push_back(image.settingsFile() + " holds " + std::to_string(settings.strangeEntries) +
                      " entries of \"Accounts\" that are no dictionaries; take them out.");
}

void checkAccountTypes(const DeviceImage& image, const Settings& settings,
                       const MigratorBundle& bundle, Reasons& reasons) {
  if (!bundle.accountTypes) return;
  const std::set<std::string> known(bundle.accountTypes->begin(), bundle.accountTypes->end());
  std::size_t unknown = 0;
  for (const propertylist::Dictionary& account : settings.accounts) {
    const std::string type = nameUnder(account, "Type");
    if (known.contains(type) || ++unknown > kMaximumAccountReasons) continue;
    reasons.push_back(image.settingsFile() + ": account " + nameUnder(account, "Identifier") +
                      " is of type \"" + type + "\", which " + bundle.name +
                      " does not know and would lose; take the account out, or use a migrator that "
                      "knows its type.");
  }
  if (unknown > kMaximumAccountReasons)
    reasons.push_back(image.settingsFile() + ": " +
                      std::to_string(unknown - kMaximumAccountReasons) +
                      " more accounts are of unknown types.");
}

struct Place {
  int error = 0;
  bool isDirectory = false;
  struct statx status = {};
};

Place placeOf(const std::string& path) {
  Place place;
  if (statx(AT_FDCWD, path.c_str(), AT_SYMLINK_NOFOLLOW, STATX_BASIC_STATS | STATX_MNT_ID,
            &place.status) != 0)
    place.error = errno;
  place.isDirectory = place.error == 0 && S_ISDIR(place.status.stx_mode);
  return place;
}

// A file is moved in one step within one mount only; two mounts of one file system do not do.
bool areOnOneMount(const Place& a, const Place& b) {
  return a.status.stx_dev_major == b.status.stx_dev_major &&
         a.status.stx_dev_minor == b.status.stx_dev_minor &&
         a.status.stx_mnt_id == b.status.stx_mnt_id;
}

void checkTemporaryDirectory(const DeviceImage& image, Reasons& reasons) {
  const std::string path = image.temporaryDirectory();
  const Place temporary = placeOf(path);
  if (!temporary.isDirectory) {
    reasons.push_back(path + " is no directory" +
                      (temporary.error != 0
                           ? " (" + std::generic_category().message(temporary.error) + ")"
                           : std::string()) +
                      "; make it, with mode 0700.");
    return;
  }
  if (image.lookAt(DeviceImage::kTemporaryDirectory).isOpenToOthers)
    reasons.push_back("Everybody may replace the files in " + path +
                      ", the new settings too; take that right from others (chmod o-w), or make "
                      "the directory sticky (chmod +t).");
  const Place preferences = placeOf(image.preferencesDirectory());
  if (preferences.isDirectory && !areOnOneMount(temporary, preferences))
    reasons.push_back(path + " is not on the file system of " + image.settingsFile() +
                      ", so that no save could replace that file in one step; unmount it.");
}

bool isGroupOfCaller(gid_t group) {
  if (group == getegid()) return true;
  const int count = getgroups(0, nullptr);
  std::vector<gid_t> groups(count > 0 ? static_cast<std::size_t>(count) : 0);
  return getgroups(count, groups.data()) > 0 &&
         std::find(groups.begin(), groups.end(), group) != groups.end();
}

// A save gives the settings file to "mobile", which only root may do for others than themselves.
void checkThatOwnerCanBeGiven(const DeviceImage& image, uid_t user, gid_t group, Reasons& reasons) {
  if (geteuid() == 0 || (user == geteuid() && isGroupOfCaller(group))) return;
  reasons.push_back("Only root or \"mobile\" itself, user " + std::to_string(user) + " and group " +
                    std::to_string(group) + " in " + image.absolutePath(DeviceImage::kUsersFile) +
                    " and " + image.absolutePath(DeviceImage::kGroupsFile) +
                    ", can save the settings file; run the host as that user or as root.");
}

void checkOwner(const DeviceImage& image, Reasons& reasons) {
  const std::optional<uid_t> user = image.userNumber(kMobile);
  const std::optional<gid_t> group = image.groupNumber(kMobile);
  if (!user)
    reasons.push_back(image.absolutePath(DeviceImage::kUsersFile) +
                      " has no user \"mobile\", who owns the settings file; add the line.");
  if (!group)
    reasons.push_back(image.absolutePath(DeviceImage::kGroupsFile) +
                      " has no group \"mobile\", which owns the settings file; add the line.");
  if (user && group) checkThatOwnerCanBeGiven(image, *user, *group, reasons);
}

// What is not there yet is made when it is needed, in a directory that is looked at too.
void checkThatWritable(const std::string& path, Reasons& reasons) {
  if (faccessat(AT_FDCWD, path.c_str(), W_OK, AT_EACCESS) == 0 || errno == ENOENT) return;
  reasons.push_back(path + " cannot be written: " + std::generic_category().message(errno) +
                    "; give the right to write, or mount the image so that it can be written.");
}

void checkWriting(const DeviceImage& image, Reasons& reasons) {
  checkThatWritable(image.rootPath(), reasons);
  if (!reasons.empty()) return;  // one reason says it all for what lies below
  std::set<std::string> paths = {image.temporaryDirectory(), image.preferencesDirectory(),
                                 image.absolutePath(DeviceImage::kLogDirectory),
                                 image.systemLogFile()};
  for (const std::string& path : paths) checkThatWritable(path, reasons);
}

}  // namespace

std::vector<std::string> reasonsNotToStart(const DeviceImage& image, const Settings& settings,
                                           const std::vector<MigratorBundle>& bundles) {
  Reasons writing;
  checkWriting(image, writing);
  Reasons reasons;
  checkSettings(image, settings, reasons);
  for (const MigratorBundle& bundle : bundles) checkAccountTypes(image, settings, bundle, reasons);
  checkTemporaryDirectory(image, reasons);
  checkOwner(image, reasons);
  reasons.insert(reasons.end(), writing.begin(), writing.end());
  return reasons;
}

}  // namespace host
