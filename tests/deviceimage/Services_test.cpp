// The smaller services over an image: log, journals, preferences, properties, processes.
#include <gmock/gmock.h>
#include <unistd.h>

#include <fstream>

#include "deviceimage/DeviceImageServices.h"
#include "deviceimage/Journal.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using propertylist::Dictionary;
using propertylist::Value;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::MatchesRegex;

class ImageServices : public testing::Test {
 protected:
  std::vector<std::string> linesIn(std::string_view name) const {
    std::ifstream file(image.path(name));
    std::vector<std::string> lines;
    for (std::string line; std::getline(file, line);) lines.push_back(line);
    return lines;
  }
  void write(std::string_view name, const Value& value) {
    ASSERT_TRUE(image.image->writePropertyList(name, value).isSuccess());
  }

  TemporaryImage image;
  std::vector<std::string> sunk;
  DeviceImageServices made{image.image,
                           {.processName = "tester",
                            .logSink = [this](std::string_view line) { sunk.emplace_back(line); }}};
  const platform::Services& services = made.services();
};

TEST_F(ImageServices, WriteOneLogLineForEachCallWithTimeAndProcess) {
  services.systemLog.writeLine("Merging \xc3\xa9 to the localstore 100%");
  EXPECT_THAT(linesIn("var/log/system.log"),
              ElementsAre(MatchesRegex(
                  "[0-9]{4}-[0-9]{2}-[0-9]{2}T[0-9]{2}:[0-9]{2}:[0-9]{2}Z tester\\[" +
                  std::to_string(::getpid()) + "\\]: Merging \xc3\xa9 to the localstore 100%")));
  EXPECT_THAT(sunk, ElementsAre("Merging \xc3\xa9 to the localstore 100%"));
}

TEST_F(ImageServices, LetNoTextBeginASecondLogLine) {
  const std::string hostile = "a\n2026-01-01T00:00:00Z tester[1]: forged\r\t\x1b[31m\x7f\xc2\x85" +
                              std::string(1, '\0') + "z";
  services.systemLog.writeLine(hostile);
  services.systemLog.writeLine("");
  EXPECT_EQ(linesIn("var/log/system.log").size(), 2U);
  EXPECT_EQ(sunk[0],
            "a\\n2026-01-01T00:00:00Z tester[1]: forged\\r\\t\\x1b[31m\\x7f\\xc2\\x85\\x00z");
}

TEST(JSONLine, HoldsTextsBooleansNumbersAndLists) {
  EXPECT_EQ(jsonLine({{"text", "a \"b\"\n\xff"},
                      {"yes", true},
                      {"no", false},
                      {"number", std::int64_t{-7}},
                      {"none", std::vector<std::string>{}},
                      {"list", std::vector<std::string>{"[", "c\\", ""}}}),
            "{\"text\": \"a \\\"b\\\"\\u000a\xef\xbf\xbd\", \"yes\": true, \"no\": false, "
            "\"number\": -7, \"none\": [], \"list\": [\"[\", \"c\\\\\", \"\"]}");
  EXPECT_EQ(jsonLine({}), "{}");
}

TEST_F(ImageServices, WriteNoLogThroughALink) {
  const std::filesystem::path outside = image.directory.path / "outside";
  std::ofstream(outside) << "before";
  std::filesystem::remove(image.path("var/log/system.log"));
  std::filesystem::create_symlink(outside, image.path("var/log/system.log"));
  services.systemLog.writeLine("text");
  EXPECT_EQ(std::filesystem::file_size(outside), 6U);
  EXPECT_THAT(sunk, ElementsAre("text"));
}

TEST_F(ImageServices, KeepNotificationsAndPreferenceChangesAsLinesOfJSON) {
  services.notifyCenter.postSystemNotification("com.vantor.Orvette.BackupAgent.WillStart");
  services.notifyCenter.postSystemNotification("quote \" back\\slash \n \xff end");
  EXPECT_THAT(linesIn("var/log/notifications.jsonl"),
              ElementsAre(MatchesRegex("\\{\"time\": \"[-0-9T:]+Z\", \"name\": "
                                       "\"com.vantor.Orvette.BackupAgent.WillStart\"\\}"),
                          testing::EndsWith("\"name\": \"quote \\\" back\\\\slash \\u000a "
                                            "\xef\xbf\xbd end\"}")));
  services.preferences.postPreferencesChanged("com.vantor.mobilemail", "MailAccounts");
  EXPECT_THAT(linesIn("var/log/preference-changes.jsonl"),
              ElementsAre(testing::EndsWith(
                  "\"application\": \"com.vantor.mobilemail\", \"key\": \"MailAccounts\"}")));
}

TEST_F(ImageServices, ReadPreferencesAnewFromTheirOwnFiles) {
  platform::PreferencesService& preferences = services.preferences;
  EXPECT_EQ(preferences.readDefault("ASLoggingEnabled"), std::nullopt);
  write(DeviceImage::kProcessDefaultsFile, Dictionary{{"ASLoggingEnabled", true}});
  EXPECT_EQ(preferences.readDefault("ASLoggingEnabled"), Value(true));
  write("var/mobile/Library/Preferences/com.example.app.plist", Dictionary{{"key", 7}});
  EXPECT_EQ(preferences.readApplicationPreference("com.example.app", "key"), Value(7));
  EXPECT_EQ(preferences.readApplicationPreference("com.example.app", "other"), std::nullopt);
  EXPECT_EQ(preferences.readApplicationPreference("com.example.none", "key"), std::nullopt);
}

TEST_F(ImageServices, ReadNoPreferencesOutsideTheirDirectory) {
  write("var/mobile/Library/secret.plist", Dictionary{{"key", "secret"}});
  write("tmp/list.plist", Value("no dictionary"));
  for (const char* application : {"../secret", "/tmp/secret", "..", ""})
    EXPECT_EQ(services.preferences.readApplicationPreference(application, "key"), std::nullopt);
  std::filesystem::create_symlink(image.path("var/mobile/Library/secret.plist"),
                                  image.path("var/mobile/Library/Preferences/linked.plist"));
  EXPECT_EQ(services.preferences.readApplicationPreference("linked", "key"), std::nullopt);
}

TEST_F(ImageServices, AnswerTheDevicesPropertiesAndItsRoot) {
  EXPECT_EQ(services.deviceInfo.queryValue("DeviceClass"), "Kallo");
  EXPECT_EQ(services.deviceInfo.queryValue("None"), std::nullopt);
  EXPECT_EQ(services.deviceInfo.systemRootDirectory(), image.image->rootPath());
  EXPECT_EQ(services.userDatabase.homeDirectory(), image.image->rootPath() + "/var/mobile");
  EXPECT_EQ(services.userDatabase.userIdentifierForName("nobody"), std::nullopt);
}

TEST_F(ImageServices, NameTheStatusKeyAsTheDevicePropertiesDoElseAsUsual) {
  EXPECT_EQ(services.accountFramework.QuillnetStatusKey(), "QuillnetStatus");
  write(DeviceImage::kDevicePropertiesFile, Dictionary{{"QuillnetStatusKey", "Other"}});
  EXPECT_EQ(services.accountFramework.QuillnetStatusKey(), "Other");
}

TEST_F(ImageServices, ForbidWhatTheRestrictionsFileForbids) {
  using platform::RestrictedFeature;
  write(DeviceImage::kRestrictionsFile,
        Dictionary{{"PhotoStream", 2}, {"CloudBackup", 1}, {"CardsWhileLocked", "2"}});
  EXPECT_EQ(services.restrictions.featureRestriction(RestrictedFeature::photoStream),
            platform::RestrictionsService::kExplicitlyForbidden);
  EXPECT_EQ(services.restrictions.featureRestriction(RestrictedFeature::cloudBackup), 0);
  EXPECT_EQ(services.restrictions.featureRestriction(RestrictedFeature::cardsWhileLocked), 0);
  EXPECT_EQ(services.restrictions.featureRestriction(RestrictedFeature::cloudDocumentSync), 0);
}

TEST_F(ImageServices, ReadTheRestrictionsOnce) {
  using platform::RestrictedFeature;
  EXPECT_EQ(services.restrictions.featureRestriction(RestrictedFeature::photoStream), 0);
  write(DeviceImage::kRestrictionsFile, Dictionary{{"PhotoStream", 2}, {"CloudBackup", 2}});
  EXPECT_EQ(services.restrictions.featureRestriction(RestrictedFeature::photoStream), 0);
  EXPECT_EQ(services.restrictions.featureRestriction(RestrictedFeature::cloudBackup), 0);
}

TEST_F(ImageServices, KnowNoProcessesButThoseOfTheImage) {
  EXPECT_THAT(services.processTable.fillTable(10).processes, IsEmpty());
  EXPECT_EQ(services.processTable.ownProcessIdentifier(), ::getpid());
  EXPECT_FALSE(services.processTable.sendSignal(::getpid(), 9).isSuccess());
}

}  // namespace
}  // namespace deviceimage
