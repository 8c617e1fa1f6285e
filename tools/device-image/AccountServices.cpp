#include "tools/device-image/AccountServices.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <span>
#include <string_view>

#include "deviceimage/Descriptor.h"
#include "tools/common/AccountCreators.h"
#include "tools/common/ExitCode.h"
#include "tools/common/Files.h"
#include "tools/common/Installation.h"

namespace tools {
namespace {

using deviceimage::DeviceImage;

constexpr std::size_t kLargestBundle = std::size_t{64} << 20U;

// The file names of the bundles in the services' directory that the installed catalogue knows.
std::set<std::string> namedServices() {
  const std::string directory = std::string(DeviceImage::kAccountServicesDirectory) + "/";
  std::set<std::string> names;
  for (const std::string& bundle : namedBundles())
    if (bundle.starts_with(directory) && bundle.size() > directory.size() &&
        bundle.find('/', directory.size()) == std::string::npos)
      names.insert(bundle.substr(directory.size()));
  return names;
}

// The files of the accounts data migrator's bundle.
constexpr std::array<std::string_view, 3> kMigratorFiles = {"Info.plist", "AccountMigrator.so",
                                                            "AccountTypesProperties.plist"};
constexpr std::string_view kMigratorFolder = "AccountMigrator.migrator";

// Where each bundle's files lie in the image, by where they lie among those that are installed.
std::map<std::string, std::string> placesInImage() {
  std::map<std::string, std::string> places;
  for (const std::string& name : namedServices())
    places.emplace(name, fmt::format("{}/{}", DeviceImage::kAccountServicesDirectory, name));
  for (const std::string_view name : kMigratorFiles) {
    const std::string file = fmt::format("{}/{}", kMigratorFolder, name);
    places.emplace(file, fmt::format("{}/{}", DeviceImage::kMigratorsDirectory, file));
  }
  return places;
}

// Empty when the file cannot be read.
std::optional<std::string> contentOf(const DeviceImage& image, const std::string& file) {
  const deviceimage::OpenedFile opened = image.openFile(file, O_RDONLY);
  if (!opened.status.isSuccess()) return std::nullopt;
  const deviceimage::Descriptor descriptor(opened.descriptor);
  std::string content;
  std::array<char, 65536> chunk{};
  while (content.size() <= kLargestBundle) {
    const ssize_t count = ::read(descriptor.number(), chunk.data(), chunk.size());
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return std::nullopt;
    if (count == 0) break;
    content.append(chunk.data(), static_cast<std::size_t>(count));
  }
  return content;
}

}  // namespace

std::vector<AccountService> installedServices() {
  try {
    std::vector<AccountService> services;
    for (const auto& [name, file] : placesInImage())
      services.push_back(
          {file, readWholeFile(installedAccountServices() + "/" + name, kLargestBundle)});
    return services;
  } catch (const CommandFailure& failure) {
    throw CommandFailure(
        failure.code(), fmt::format("{}; or leave the account services out with --without-services",
                                    failure.what()));
  }
}

platform::Status placeServices(const DeviceImage& image,
                               const std::vector<AccountService>& services) {
  platform::Status status = platform::Status::success();
  for (const AccountService& service : services)
    if (status.isSuccess())
      status = image.createFile(
          service.file,
          {reinterpret_cast<const std::uint8_t*>(service.content.data()), service.content.size()});
  return status;
}

ServicesCheck checkServices(const DeviceImage& image) {
  ServicesCheck check;
  const std::string directory(DeviceImage::kAccountServicesDirectory);
  if (!image.exists(directory)) return check;  // an image without services
  try {
    for (const auto& [name, file] : placesInImage()) {
      const bool isService = file.starts_with(DeviceImage::kAccountServicesDirectory);
      const std::string installed = installedAccountServices() + "/" + name;
      const bool isThere = image.lookAt(file).kind == deviceimage::FileLook::Kind::file;
      if (!isThere && isService)
        check.missing.push_back(
            {file, fmt::format("is missing, and accounts need this service; copy {} there, with "
                               "mode 0600",
                               installed)});
      else if (isThere && contentOf(image, file) != readWholeFile(installed, kLargestBundle))
        check.warnings.push_back(
            {file, fmt::format("is not the installed {}; where it should be, copy {} there",
                               isService ? "service" : "migrator", installed)});
    }
  } catch (const CommandFailure& failure) {
    check.warnings.push_back(
        {directory, fmt::format("cannot be compared with what is installed: {}", failure.what())});
  }
  return check;
}

}  // namespace tools
