#pragma once

#include <string>
#include <vector>

#include "platform/BundleResources.h"
#include "tests/contracts/Port.h"

// One bundle without resources.
class BundleResourcesUnderTest {
 public:
  virtual ~BundleResourcesUnderTest() = default;
  // A service for a user who prefers these languages, the first one first. The former one is let
  // go.
  virtual platform::BundleResources& serviceForLanguages(std::vector<std::string> languages) = 0;
  // An address in the bundle.
  virtual const void* code() = 0;
  virtual void addFile(const std::string& fileName, const std::string& content) = 0;
  // Adds the string table `table` in `language` with one text.
  virtual void addText(const std::string& language, const std::string& table,
                       const std::string& key, const std::string& text) = 0;
  // The content of the file at a path that the service gave.
  virtual std::string contentOf(const std::string& path) = 0;
};
using BundleResourcesPort = Port<BundleResourcesUnderTest>;

class BundleResourcesContract : public Contract<BundleResourcesUnderTest> {
 protected:
  std::string text(const std::vector<std::string>& languages, const std::string& key) {
    return device->serviceForLanguages(languages).localizedString(device->code(), key, "Table");
  }
};

TEST_P(BundleResourcesContract, FindsAFileOfTheBundle) {
  device->addFile("Types.plist", "content");
  platform::BundleResources& service = device->serviceForLanguages({"en"});
  const auto path = service.pathForResource(device->code(), "Types", "plist");
  ASSERT_TRUE(path.has_value());
  EXPECT_EQ(device->contentOf(*path), "content");
  EXPECT_FALSE(service.pathForResource(device->code(), "Types", "strings").has_value());
  EXPECT_FALSE(service.pathForResource(device->code(), "Missing", "plist").has_value());
}

TEST_P(BundleResourcesContract, FindsNothingOutsideTheBundle) {
  platform::BundleResources& service = device->serviceForLanguages({"en"});
  EXPECT_FALSE(service.pathForResource(device->code(), "../../etc/host", "conf").has_value());
  EXPECT_FALSE(service.pathForResource(device->code(), "", "").has_value());
  EXPECT_EQ(service.localizedString(device->code(), "Key", "../Table"), "Key");
}

TEST_P(BundleResourcesContract, SpeaksTheFirstPreferredLanguageThatTheBundleHas) {
  device->addText("en", "Table", "Greeting", "Hello");
  device->addText("de", "Table", "Greeting", "Hallo");
  EXPECT_EQ(text({"de"}, "Greeting"), "Hallo");
  EXPECT_EQ(text({"fr", "de", "en"}, "Greeting"), "Hallo");
  EXPECT_EQ(text({"en", "de"}, "Greeting"), "Hello");
}

TEST_P(BundleResourcesContract, SpeaksEnglishWhenTheBundleHasNoPreferredLanguage) {
  device->addText("en", "Table", "Greeting", "Hello");
  device->addText("de", "Table", "Greeting", "Hallo");
  EXPECT_EQ(text({"fr"}, "Greeting"), "Hello");
  EXPECT_EQ(text({}, "Greeting"), "Hello");
}

TEST_P(BundleResourcesContract, YieldsTheKeyWithoutATextForIt) {
  EXPECT_EQ(text({"en"}, "Greeting"), "Greeting");
  device->addText("en", "Table", "Greeting", "Hello");
  EXPECT_EQ(text({"en"}, "Farewell"), "Farewell");
  EXPECT_EQ(device->serviceForLanguages({"en"}).localizedString(device->code(), "Greeting", "None"),
            "Greeting");
}
