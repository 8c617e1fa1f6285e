#include "host/SettingsFileCheck.h"

namespace host {
namespace {

constexpr mode_t kPrivate = S_IFREG | S_IRUSR | S_IWUSR;

}  // namespace

std::vector<std::string> checkSettingsFile(const deviceimage::DeviceImage& image,
                                           const Settings& before, const Settings& after) {
  const std::string path = image.settingsFile();
  if (!after.exists)
    return before.exists ? std::vector{path + " is gone."} : std::vector<std::string>();
  if (!after.error.empty()) return {path + " cannot be read any more: " + after.error + "."};
  std::vector<std::string> problems;
  if (before.exists && isSameFile(before.file, after.file)) return problems;
  if (after.version != kPresentVersion)
    problems.push_back(path + " was written without the version " +
                       std::to_string(kPresentVersion) + ".");
  if (after.file.st_mode != kPrivate)
    problems.push_back(path +
                       " was written so that it is not readable and writable by its owner "
                       "alone.");
  if (after.file.st_uid != image.userNumber("mobile") ||
      after.file.st_gid != image.groupNumber("mobile"))
    problems.push_back(path + " was written and does not belong to \"mobile\".");
  return problems;
}

}  // namespace host
