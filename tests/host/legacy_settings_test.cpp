// The host decides before the migrator's process starts, and that process lets the account settings
// library decide again: both must see the same.
#include "host/LegacySettings.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <optional>
#include <ostream>
#include <string>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "propertylist/Writing.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace host {
namespace {

namespace files = std::filesystem;

constexpr const char* kMailAccounts = "var/mobile/Library/Mail/Accounts.plist";
constexpr const char* kDataAccess = "var/mobile/Library/Preferences/com.vantor.DataAccess.plist";

struct Needs {
  std::string name;
  std::string mailAccounts = {};  // what is there: nothing, "file", "directory", "link", "dangling"
  std::string dataAccess = {};
  std::optional<propertylist::Dictionary> settings = {};
  LegacyNeed expected = {};
};
void PrintTo(const Needs& needs, std::ostream* stream) { *stream << needs.name; }

propertylist::Dictionary ofVersion(propertylist::Value version) {
  return {{"Version", std::move(version)}};
}

class LegacyNeedOfAnImage : public testing::TestWithParam<Needs> {
 protected:
  void put(const char* name, const std::string& kind) const {
    const files::path path = image.path(name);
    files::create_directories(path.parent_path());
    if (kind == "file") std::ofstream(path) << "x";
    if (kind == "directory") files::create_directory(path);
    if (kind == "link") files::create_symlink(image.path("etc/passwd"), path);
    if (kind == "dangling") files::create_symlink("nowhere", path);
  }
  void writeSettings(const propertylist::Dictionary& root) const {
    const auto bytes = propertylist::writeBinaryPropertyList(root);
    std::ofstream(image.image->settingsFile(), std::fstream::binary)
        .write(reinterpret_cast<const char*>(bytes->data()),
               static_cast<std::streamsize>(bytes->size()));
  }
  deviceimage::TemporaryImage image;
};

TEST_P(LegacyNeedOfAnImage, IsTheSameToTheHostAndToTheLibrary) {
  put(kMailAccounts, GetParam().mailAccounts);
  put(kDataAccess, GetParam().dataAccess);
  if (GetParam().settings) writeSettings(*GetParam().settings);

  const LegacyNeed toHost = legacyNeedOf(*image.image);
  EXPECT_EQ(toHost.mailAccounts, GetParam().expected.mailAccounts);
  EXPECT_EQ(toHost.dataAccess, GetParam().expected.dataAccess);
  EXPECT_EQ(toHost.olderVersion, GetParam().expected.olderVersion);

  const deviceimage::DeviceImageServices services(image.image);
  platform::install(services.services());
  LegacyNeed toLibrary;
  accountsettings::ASSAccountsManager::shouldMigrateOldMailAccountsOldDAAccountsNewAccountSettings(
      &toLibrary.mailAccounts, &toLibrary.dataAccess, &toLibrary.olderVersion);
  EXPECT_EQ(toLibrary.mailAccounts, toHost.mailAccounts);
  EXPECT_EQ(toLibrary.dataAccess, toHost.dataAccess);
  EXPECT_EQ(toLibrary.olderVersion, toHost.olderVersion);
}

INSTANTIATE_TEST_SUITE_P(
    Of, LegacyNeedOfAnImage,
    testing::Values(
        Needs{"NothingAtAll"}, Needs{"AMailFile", "file", "", {}, {true, false, false}},
        Needs{"AMailDirectory", "directory", "", {}, {true, false, false}},
        Needs{"ALinkToAFile", "link", "", {}, {true, false, false}},
        Needs{"ALinkToNothing", "dangling", "dangling", {}, {false, false, false}},
        Needs{"DataAccessPreferences", "", "file", {}, {false, true, false}},
        Needs{"Both", "file", "file", {}, {true, true, false}},
        Needs{"AnOldVersion", "", "", ofVersion(11), {false, false, true}},
        Needs{"AnOldVersionBehindALinkToNothing",
              "dangling",
              "",
              ofVersion(11),
              {false, false, true}},
        Needs{"AnOldVersionBesideAMailFile", "file", "", ofVersion(11), {true, false, false}},
        Needs{"ThePresentVersion", "", "", ofVersion(12)},
        Needs{"ANewerVersion", "", "", ofVersion(13)},
        Needs{"ANegativeVersion", "", "", ofVersion(-1)},
        Needs{"AVersionThatIsNoNumber", "", "", ofVersion("eleven"), {false, false, true}},
        Needs{"AVersionInLetters", "", "", ofVersion("12")},
        Needs{"NoVersion", "", "", propertylist::Dictionary{}}),
    [](const testing::TestParamInfo<Needs>& tested) { return tested.param.name; });

}  // namespace
}  // namespace host
