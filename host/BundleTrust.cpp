#include "host/BundleTrust.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <system_error>

namespace host {
namespace {

constexpr const char* kThisProgram = "/proc/self/exe";

std::string errorText(int number) { return std::generic_category().message(number); }

// A group counts as the caller's own when its number is the caller's: the private group of a user.
bool othersMayWrite(const struct stat& status) {
  const bool groupIsOwn = status.st_gid == 0 || status.st_gid == geteuid();
  return (status.st_mode & S_IWOTH) != 0 || ((status.st_mode & S_IWGRP) != 0 && !groupIsOwn);
}

bool ownerIsTrusted(const struct stat& status) {
  if (status.st_uid == 0 || status.st_uid == geteuid()) return true;
  struct stat program = {};
  return stat(kThisProgram, &program) == 0 && status.st_uid == program.st_uid;
}

std::filesystem::path thisProgram() {
  std::error_code error;
  std::filesystem::path program = std::filesystem::read_symlink(kThisProgram, error);
  return error ? "/" : program;  // then every folder below it is looked at
}

bool holds(const std::filesystem::path& folder, const std::filesystem::path& file) {
  const auto [end, ignored] = std::mismatch(folder.begin(), folder.end(), file.begin(), file.end());
  return end == folder.end();
}

// The second half of the reasons for what belongs to somebody else.
std::string giveItBack(const TrustWords& words) {
  return "; give it to " + std::string(words.caller) + " or to root with chown.";
}

std::optional<std::string> whyFolderAboveIsNotTrusted(const std::string& path,
                                                      const TrustWords& words) {
  struct stat status = {};
  if (lstat(path.c_str(), &status) != 0)
    return path + " cannot be looked at: " + errorText(errno) + "; " + std::string(words.remedy) +
           ".";
  if (!S_ISDIR(status.st_mode)) return path + " is no folder; put a folder, not a link, there.";
  if (othersMayWrite(status) && (status.st_mode & S_ISVTX) == 0)
    return path + " may be written by others, who could replace " + std::string(words.code) +
           " in it; take the right from them with chmod go-w.";
  if (!ownerIsTrusted(status))
    return path + " belongs to another user, who could replace " + std::string(words.code) +
           " in it" + giveItBack(words);
  return std::nullopt;
}

}  // namespace

std::optional<std::string> whyNotTrusted(const std::string& path, const TrustWords& words) {
  struct stat status = {};
  if (lstat(path.c_str(), &status) != 0)
    return path + " cannot be looked at: " + errorText(errno) + "; " + std::string(words.remedy) +
           ".";
  if (!S_ISREG(status.st_mode) && !S_ISDIR(status.st_mode))
    return path + " is neither a file nor a folder; " + std::string(words.remedy) + ".";
  if (othersMayWrite(status))
    return path + " may be written by others; take the right from them with chmod go-w.";
  if (!ownerIsTrusted(status)) return path + " belongs to another user" + giveItBack(words);
  const std::filesystem::path program = thisProgram();
  for (std::filesystem::path above = std::filesystem::path(path).parent_path();
       !holds(above, program); above = above.parent_path())
    if (auto reason = whyFolderAboveIsNotTrusted(above.string(), words)) return reason;
  return std::nullopt;
}

std::optional<std::string> whyFolderNotTrusted(const std::string& path, const TrustWords& words) {
  if (auto reason = whyNotTrusted(path, words)) return reason;
  std::error_code error;
  std::filesystem::recursive_directory_iterator entry(path, error);
  for (const std::filesystem::recursive_directory_iterator end; !error && entry != end;
       entry.increment(error))
    if (auto reason = whyNotTrusted(entry->path().string(), words)) return reason;
  if (error) return path + " cannot be looked through: " + error.message() + "; check its rights.";
  return std::nullopt;
}

}  // namespace host
