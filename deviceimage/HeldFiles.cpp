#include "deviceimage/HeldFiles.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <optional>
#include <utility>

#include "deviceimage/Database.h"

namespace deviceimage {
namespace {

constexpr std::string_view kDescriptors = "/proc/self/fd/";

sqlite3_vfs& usual() { return *sqlite3_vfs_find(nullptr); }

struct HeldName {
  int directory;
  const char* name;
};

// Empty for a path that heldPath does not give.
std::optional<HeldName> heldName(std::string_view path) {
  if (!path.starts_with(kDescriptors)) return std::nullopt;
  HeldName held = {-1, nullptr};
  const char* const end = path.data() + path.size();
  const auto [slash, error] =
      std::from_chars(path.data() + kDescriptors.size(), end, held.directory);
  if (error != std::errc() || held.directory < 0 || slash == end || *slash != '/')
    return std::nullopt;
  held.name = slash + 1;
  const std::string_view name(held.name, static_cast<std::size_t>(end - held.name));
  if (name.empty() || name == "." || name == ".." || name.find('/') != std::string_view::npos)
    return std::nullopt;
  return held;
}

enum class Look { nothing, emptyFile, file, other };

Look lookAt(const char* path) {
  const std::optional<HeldName> held = heldName(path);
  struct stat found = {};
  if (!held) return Look::other;
  if (::fstatat(held->directory, held->name, &found, AT_SYMLINK_NOFOLLOW) != 0)
    return errno == ENOENT ? Look::nothing : Look::other;
  if (!S_ISREG(found.st_mode)) return Look::other;
  return found.st_size > 0 ? Look::file : Look::emptyFile;
}

// SQLite asks for two journals before each read. By the path it would take the system three times
// as long.
int answerAccess(sqlite3_vfs* /*files*/, const char* path, int /*what*/, int* answer) {
  const std::string_view whole(path);
  // The names of others come from journals.
  const bool isJournal = whole.ends_with("-journal") || whole.ends_with("-wal");
  const Look look = isJournal ? lookAt(path) : Look::other;
  *answer = look == Look::file ? 1 : 0;  // an empty journal is none
  return look == Look::other ? SQLITE_IOERR_ACCESS : SQLITE_OK;
}

// A file without a name is SQLite's own, for what it cannot keep in memory. With a journal of the
// write-ahead mode it would open a third file by itself, and wait for a FIFO there.
int openHeld(sqlite3_vfs* /*files*/, sqlite3_filename path, sqlite3_file* file, int flags,
             int* flagsOfFile) {
  file->pMethods = nullptr;  // not open
  constexpr int kNeverOpened = SQLITE_OPEN_SUPER_JOURNAL | SQLITE_OPEN_WAL;
  if (path != nullptr && ((flags & kNeverOpened) != 0 || lookAt(path) == Look::other))
    return SQLITE_CANTOPEN;
  return usual().xOpen(&usual(), path, file, flags, flagsOfFile);
}

int deleteHeld(sqlite3_vfs* /*files*/, const char* path, int isLasting) {
  if (!heldName(path)) return SQLITE_IOERR_DELETE;
  return usual().xDelete(&usual(), path, isLasting);
}

int takeAsItIs(sqlite3_vfs* /*files*/, const char* name, int size, char* full) {
  const std::string_view whole(name);
  if (std::cmp_greater_equal(whole.size(), size)) return SQLITE_CANTOPEN;
  *std::copy(whole.begin(), whole.end(), full) = '\0';
  return SQLITE_OK;
}

}  // namespace

const char* wayToHeldFiles() {
  static sqlite3_vfs files = usual();
  static const int registered = [] {
    files.zName = "held-directory";
    files.xFullPathname = takeAsItIs;
    files.xAccess = answerAccess;
    files.xOpen = openHeld;
    files.xDelete = deleteHeld;
    return sqlite3_vfs_register(&files, 0);
  }();
  if (registered != SQLITE_OK) throw DatabaseFailure(registered, sqlite3_errstr(registered));
  return files.zName;
}

std::string heldPath(int directory, std::string_view name) {
  return std::string(kDescriptors) + std::to_string(directory) + "/" + std::string(name);
}

}  // namespace deviceimage
