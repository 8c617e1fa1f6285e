// The input's first byte chooses one of the image's own files, which gets the other bytes: the
// property lists of the device, of programs and of configuration profiles, the settings as the host
// sees them, a migrator's Info.plist, and the lists of users and groups. Whoever reads them
// answers.
#include <fcntl.h>
#include <stdlib.h>
#include <unistd.h>

#include <filesystem>
#include <stdexcept>
#include <vector>

#include "deviceimage/DeviceImageServices.h"
#include "deviceimage/ImageProperties.h"
#include "deviceimage/SyncAgent.h"
#include "fuzz/Check.h"
#include "fuzz/Share.h"
#include "host/MigratorBundle.h"
#include "host/Settings.h"
#include "host/StartChecks.h"

namespace {

using deviceimage::DeviceImage;
constexpr std::string_view kBundle = "System/Library/DataClassMigrators/Some.migrator";
// What looks mostly at folders, and little at the bytes, is done for one of so many inputs: it
// takes longer than all else.
constexpr std::uint32_t kShareOfLooks = 8;

// An image in the directory of temporary files, which goes with the process.
class Image {
 public:
  Image() {
    std::string path = (std::filesystem::temp_directory_path() / "fuzz-image-XXXXXX").string();
    if (::mkdtemp(path.data()) == nullptr) throw std::runtime_error("cannot make " + path);
    _path = path;
    image = DeviceImage::create(path).image;
    if (image == nullptr) throw std::runtime_error("cannot make an image in " + path);
    deviceimage::ServiceOptions options;
    options.writesLog = false;
    services = std::make_unique<deviceimage::DeviceImageServices>(image, options);
    for (const std::string& name :
         {std::string(DeviceImage::kDevicePropertiesFile),
          std::string(DeviceImage::kProcessDefaultsFile),
          std::string(DeviceImage::kRestrictionsFile),
          *DeviceImage::preferencesFile(deviceimage::SyncAgent::kApplication),
          std::string(DeviceImage::kSettingsFile), std::string(kBundle) + "/Info.plist",
          std::string(DeviceImage::kUsersFile), std::string(DeviceImage::kGroupsFile)})
      _open(image->absolutePath(name));
  }
  ~Image() {
    for (const int file : _files) ::close(file);
    std::error_code ignored;
    std::filesystem::remove_all(_path, ignored);
  }
  Image(const Image&) = delete;
  Image& operator=(const Image&) = delete;

  // Gives the file of the number these bytes. It stays open, because looking for it takes longer
  // than all that is done with it.
  void write(std::size_t number, std::span<const std::uint8_t> bytes) const {
    const auto size = static_cast<ssize_t>(bytes.size());
    if (::pwrite(_files[number], bytes.data(), bytes.size(), 0) != size ||
        ::ftruncate(_files[number], size) != 0)
      throw std::runtime_error("cannot write a file of " + _path.string());
  }

  std::size_t filesCount() const { return _files.size(); }

  std::shared_ptr<const DeviceImage> image;
  std::unique_ptr<deviceimage::DeviceImageServices> services;

 private:
  void _open(const std::filesystem::path& path) {
    std::filesystem::create_directories(path.parent_path());
    _files.push_back(::open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600));
    if (_files.back() < 0) throw std::runtime_error("cannot open " + path.string());
  }

  std::filesystem::path _path;
  std::vector<int> _files;
};

void readSettings(const DeviceImage& image, bool isDictionary, bool looksAtFolders) {
  const host::Settings settings = host::readSettings(image);
  FUZZ_CHECK(settings.error.empty() == isDictionary);
  host::Selection selection{"QuillnetStatus", {{{"Quillnet", "VantorAccount"}, 1}}};
  for (const propertylist::Dictionary& account : settings.accounts) {
    if (selection.covers(account)) FUZZ_CHECK(!host::typeOf(account).empty());
    deviceimage::SyncAgent(image).storeIdentifier(account, deviceimage::Dataclass::calendars);
  }
  if (looksAtFolders)
    FUZZ_CHECK(isDictionary || !host::reasonsNotToStart(image, settings, {}).empty());
}

void readBundle(const DeviceImage& image, bool looksAtFolders) {
  const host::ReadBundle read = host::readMigratorBundle(image.absolutePath(kBundle));
  FUZZ_CHECK(read.bundle.has_value() == read.problems.empty());
  if (looksAtFolders) FUZZ_CHECK(host::readMigratorBundlesOfImage(image).size() <= 1);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const Image made;
  const DeviceImage& image = *made.image;
  const platform::Services& services = made.services->services();
  if (size == 0) return 0;
  const std::size_t chosen = data[0] % made.filesCount();
  const bool looksAtFolders = fuzz::isOneOf(kShareOfLooks, {data, size});
  const std::span<const std::uint8_t> bytes(data + 1, size - 1);
  made.write(chosen, bytes);
  const propertylist::ReadResult list = propertylist::readPropertyList(bytes);
  const bool isDictionary = list.value && list.value->asDictionary() != nullptr;
  const auto has = [&](std::string_view key) {
    return isDictionary && list.value->asDictionary()->contains(key);
  };
  switch (chosen) {
    case 0:
      FUZZ_CHECK(!services.deviceInfo.queryValue("key") || has("key"));
      break;
    case 1:
      FUZZ_CHECK(services.preferences.readDefault("key").has_value() == has("key"));
      break;
    case 2:  // one object reads its file once
      FUZZ_CHECK(deviceimage::ImageRestrictions(made.image)
                         .featureRestriction(platform::RestrictedFeature::photoStream) == 0 ||
                 has("PhotoStream"));
      break;
    case 3:
      FUZZ_CHECK(!deviceimage::SyncAgent(image).quillnetStoreIdentifier() ||
                 has(deviceimage::SyncAgent::kAccountNameKey));
      break;
    case 4:
      readSettings(image, isDictionary, looksAtFolders);
      break;
    case 5:
      readBundle(image, looksAtFolders);
      break;
    case 6:
      image.userNumber("mobile");
      break;
    default:
      image.groupNumber("mobile");
      break;
  }
  return 0;
}
