#pragma once

#include <sys/statvfs.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

#include "deviceimage/DeviceImage.h"
#include "deviceimage/RecordStores.h"

namespace deviceimage {

// Every byte of the file; empty when there is none.
inline std::string textOf(const std::filesystem::path& path) {
  std::ifstream file(path, std::fstream::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

// A directory of its own for one test, which goes with the object. In memory where the machine has
// such a file system that programs can be run from, because an image waits for the disk with every
// change.
class TemporaryDirectory {
 public:
  TemporaryDirectory() {
    struct statvfs memory = {};
    const bool inMemory = ::statvfs("/dev/shm", &memory) == 0 && (memory.f_flag & ST_NOEXEC) == 0 &&
                          ::access("/dev/shm", W_OK) == 0;
    std::string name = inMemory ? "/dev/shm" : "/tmp";
    name += "/deviceimage-test-XXXXXX";
    if (::mkdtemp(name.data()) == nullptr) throw std::runtime_error("mkdtemp");
    path = name;
  }
  ~TemporaryDirectory() {
    std::error_code ignored;
    std::filesystem::remove_all(path, ignored);
  }
  TemporaryDirectory(const TemporaryDirectory&) = delete;
  TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

  std::filesystem::path path;
};

// A new image in a directory of its own.
class TemporaryImage {
 public:
  TemporaryImage() {
    OpenedImage made = DeviceImage::create(root().string());
    if (made.image == nullptr) throw std::runtime_error(made.error);
    image = std::move(made.image);
  }
  // A copy of all that the other image holds.
  explicit TemporaryImage(const TemporaryImage& other) {
    std::filesystem::copy(other.root(), root(), std::filesystem::copy_options::recursive);
    image = DeviceImage::open(root().string()).image;
    if (image == nullptr) throw std::runtime_error("the copy cannot be opened");
  }
  std::filesystem::path root() const { return directory.path / "image"; }
  // The path of a name inside the image, for other programs and for doing damage.
  std::filesystem::path path(std::string_view relative) const { return root() / relative; }
  RecordStores stores() const { return {image, RecordStores::Access::readWrite}; }

  TemporaryDirectory directory;
  std::shared_ptr<const DeviceImage> image;
};

// A record in the default collection, or in the one that is named.
inline NewRecord record(std::string uid, std::string content, std::int64_t modifiedAt = 1000,
                        std::vector<std::string> path = {}) {
  return {std::move(path), std::move(uid), std::move(content), modifiedAt};
}

// One line for each record of a store, by UID: "uid: content", and " (of <uid>)" for a conflict
// copy.
inline std::vector<std::string> linesOf(RecordStores& stores, Dataclass dataclass,
                                        const std::optional<Store>& store) {
  std::vector<std::string> lines;
  if (!store) return lines;
  const platform::Status visited = stores.visitRecords(
      dataclass, store->row, true, [&](const Record& visitedRecord, std::string_view content) {
        std::string line = visitedRecord.uid + ": " + std::string(content);
        if (visitedRecord.conflictCopyOf) line += " (of " + *visitedRecord.conflictCopyOf + ")";
        lines.push_back(std::move(line));
        return true;
      });
  if (!visited.isSuccess()) lines.push_back("failure: " + visited.error->description);
  return lines;
}

// The same for the active store of the account, or for the device-local store.
inline std::vector<std::string> linesOf(const TemporaryImage& image, Dataclass dataclass,
                                        const std::optional<std::string>& account = std::nullopt) {
  RecordStores stores = image.stores();
  return linesOf(stores, dataclass, stores.findStore(dataclass, account).store);
}

// The same for all retired stores of the account together.
inline std::vector<std::string> retiredLinesOf(const TemporaryImage& image, Dataclass dataclass,
                                               const std::optional<std::string>& account) {
  RecordStores stores = image.stores();
  std::vector<std::string> lines;
  for (const Store& store : stores.listStores(dataclass).stores)
    if (store.retired && store.account == account)
      for (std::string& line : linesOf(stores, dataclass, store)) lines.push_back(std::move(line));
  return lines;
}

// What is wrong with any database of the image.
inline std::vector<std::string> databaseProblems(const TemporaryImage& image) {
  RecordStores stores(image.image, RecordStores::Access::readOnly);
  std::vector<std::string> problems;
  for (const DatabaseReport& report : stores.checkDatabases())
    problems.insert(problems.end(), report.problems.begin(), report.problems.end());
  return problems;
}

}  // namespace deviceimage
