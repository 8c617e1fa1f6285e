#include "host/UnusableDatabases.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <optional>
#include <set>
#include <system_error>

#include "deviceimage/Dataclass.h"
#include "deviceimage/RecordStores.h"

namespace host {
namespace {

using deviceimage::DatabaseReport;
using deviceimage::DeviceImage;
using deviceimage::RecordStores;

constexpr char kSeparator = ',';  // in no path of a database

std::set<std::string> pathsOf(const std::vector<UnusableDatabase>& databases) {
  std::set<std::string> paths;
  for (const UnusableDatabase& database : databases) paths.insert(database.path);
  return paths;
}

// What is not there yet is made when it is needed, in a folder that is looked at too.
std::optional<std::string> whyNotWritable(const std::string& path) {
  if (faccessat(AT_FDCWD, path.c_str(), W_OK, AT_EACCESS) == 0 || errno == ENOENT)
    return std::nullopt;
  return path + " cannot be written: " + std::generic_category().message(errno) +
         "; give the right to write, or mount the image so that it can be written";
}

void findUnwritable(const DeviceImage& image, const std::string& relative,
                    std::vector<UnusableDatabase>& found) {
  const std::string path = image.absolutePath(relative);
  std::optional<std::string> why = whyNotWritable(path.substr(0, path.rfind('/')));
  if (!why) why = whyNotWritable(path);
  if (why) found.push_back({relative, std::move(*why), true});
}

UnusableDatabase notLookedAt(const DatabaseReport& database) {
  return {database.path,
          "it cannot be looked at now: " + database.problems.front() +
              "; mend that, and run the host again",
          false, true};
}

// Those that somebody is about to write, but lets others read: each change of ours would have to
// wait, and fail in the end.
void findThoseInUse(const std::shared_ptr<const DeviceImage>& image,
                    std::vector<UnusableDatabase>& found) {
  RecordStores stores(image, RecordStores::Access::readWrite);
  const std::set<std::string> known = pathsOf(found);
  for (const deviceimage::Dataclass dataclass : deviceimage::kDataclasses) {
    if (dataclass == deviceimage::Dataclass::reminders) continue;  // in the calendars' database
    const std::string path(DeviceImage::databaseFile(deviceimage::syncTypeOf(dataclass)));
    if (known.contains(path)) continue;
    const DatabaseReport database = stores.tryToWrite(dataclass);
    if (database.problems.empty()) continue;
    if (database.mayPass)
      found.push_back(notLookedAt(database));
    else
      found.push_back(
          {path, "it is in use: " + database.problems.front() + "; wait for who uses it", true});
  }
}

}  // namespace

void rollBackLeftovers(const std::shared_ptr<const DeviceImage>& image,
                       const std::vector<UnusableDatabase>& leftAlone) {
  RecordStores(image, RecordStores::Access::readWrite)
      .recoverDatabases(pathsOf(leftAlone))
      .ignore("what cannot be recovered shows in the check");
}

std::vector<UnusableDatabase> findUnusableDatabases(const std::shared_ptr<const DeviceImage>& image,
                                                    RecordStores& stores) {
  rollBackLeftovers(image, {});
  std::vector<UnusableDatabase> found;
  for (const DatabaseReport& database : stores.checkDatabases()) {
    if (database.problems.empty())
      findUnwritable(*image, database.path, found);
    else if (database.mayPass)
      found.push_back(notLookedAt(database));
    else
      found.push_back({database.path, "it is damaged or in use: " + database.problems.front() +
                                          "; bring back a sound copy, or wait for who uses it"});
  }
  findThoseInUse(image, found);
  return found;
}

std::string joinedPaths(const std::vector<UnusableDatabase>& databases) {
  std::string joined;
  for (const UnusableDatabase& database : databases) joined += database.path + kSeparator;
  return joined;
}

std::vector<std::string> pathsJoinedIn(std::string_view joined) {
  std::vector<std::string> paths;
  for (std::size_t end = 0; (end = joined.find(kSeparator)) != std::string_view::npos;
       joined.remove_prefix(end + 1))
    paths.emplace_back(joined.substr(0, end));
  return paths;
}

std::vector<std::string> newDamage(const DeviceImage& image, RecordStores& stores,
                                   const std::vector<UnusableDatabase>& leftAlone) {
  std::vector<std::string> sentences;
  for (const DatabaseReport& database : stores.checkDatabases(pathsOf(leftAlone)))
    for (const std::string& problem : database.problems)
      sentences.push_back(image.absolutePath(database.path) +
                          " is damaged, or cannot be looked at: " + problem +
                          "; look at it with device-image check, and bring back a sound copy "
                          "when it is damaged.");
  return sentences;
}

}  // namespace host
