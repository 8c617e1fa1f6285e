#include "host/StaleFiles.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <string_view>

#include "deviceimage/Descriptor.h"

namespace host {
namespace {

constexpr std::string_view kPrefix = "file";
constexpr std::size_t kRandomLetters = 6;
constexpr std::string_view kBinaryBeginning = "bplist00";

bool isTemporaryName(std::string_view name) {
  if (!name.starts_with(kPrefix) || name.size() != kPrefix.size() + kRandomLetters) return false;
  name.remove_prefix(kPrefix.size());
  return std::all_of(name.begin(), name.end(), [](char letter) {
    return (letter >= '0' && letter <= '9') || (letter >= 'A' && letter <= 'Z') ||
           (letter >= 'a' && letter <= 'z');
  });
}

bool isLeftOver(const deviceimage::DeviceImage& image, const std::string& relative) {
  const deviceimage::OpenedFile opened = image.openFile(relative, O_RDONLY);
  if (!opened.status.isSuccess()) return false;
  const deviceimage::Descriptor file(opened.descriptor);
  struct stat status = {};
  if (fstat(file.number(), &status) != 0 || !S_ISREG(status.st_mode)) return false;
  if ((status.st_mode & 07777U) != 0600U || status.st_nlink != 1) return false;
  if (status.st_uid != geteuid() && status.st_uid != image.userNumber("mobile")) return false;
  std::array<char, kBinaryBeginning.size()> beginning = {};
  const ssize_t size = read(file.number(), beginning.data(), beginning.size());
  return size >= 0 &&
         kBinaryBeginning.starts_with({beginning.data(), static_cast<std::size_t>(size)});
}

}  // namespace

std::vector<std::string> removeStaleTemporaryFiles(const deviceimage::DeviceImage& image) {
  std::vector<std::string> removed;
  for (const std::string& name : image.namesIn(deviceimage::DeviceImage::kTemporaryDirectory)) {
    if (!isTemporaryName(name)) continue;
    const std::string relative =
        std::string(deviceimage::DeviceImage::kTemporaryDirectory) + "/" + name;
    if (isLeftOver(image, relative) && image.removeFile(relative).isSuccess())
      removed.push_back(name);
  }
  return removed;
}

}  // namespace host
