#pragma once

#include <string>
#include <utility>
#include <vector>

#include "platform/PreferencesService.h"
#include "tests/contracts/Port.h"

// One device without preferences.
class PreferencesUnderTest {
 public:
  virtual ~PreferencesUnderTest() = default;
  virtual platform::PreferencesService& service() = 0;
  virtual void setDefault(const std::string& key, const propertylist::Value& value) = 0;
  virtual void setPreference(const std::string& application, const std::string& key,
                             const propertylist::Value& value) = 0;
  // The application and key of each change that was broadcast, in order.
  virtual std::vector<std::pair<std::string, std::string>> postedChanges() = 0;
};
using PreferencesPort = Port<PreferencesUnderTest>;

class PreferencesContract : public Contract<PreferencesUnderTest> {
 protected:
  using Found = std::optional<propertylist::Value>;
};

TEST_P(PreferencesContract, ReadsAValueOfAnyKindAsItIs) {
  const std::pair<std::string, propertylist::Value> kValues[] = {
      {"string", "caf\xC3\xA9"},
      {"integer", -5},
      {"real", 0.5},
      {"boolean", true},
      {"array", propertylist::Array{"a", 1}},
      {"dictionary", propertylist::Dictionary{{"a", false}}},
  };
  for (const auto& [key, value] : kValues) {
    device->setDefault(key, value);
    device->setPreference("com.vantor.OTASyncAgent", key, value);
  }
  for (const auto& [key, value] : kValues) {
    SCOPED_TRACE(key);
    EXPECT_EQ(device->service().readDefault(key), Found(value));
    EXPECT_EQ(device->service().readApplicationPreference("com.vantor.OTASyncAgent", key),
              Found(value));
  }
}

TEST_P(PreferencesContract, FindsNothingWhereNothingIs) {
  EXPECT_EQ(device->service().readDefault("Missing"), Found());
  EXPECT_EQ(device->service().readApplicationPreference("com.vantor.None", "Key"), Found());
  device->setPreference("com.vantor.One", "Key", 1);
  EXPECT_EQ(device->service().readApplicationPreference("com.vantor.One", "Other"), Found());
  EXPECT_EQ(device->service().readApplicationPreference("com.vantor.Two", "Key"), Found());
  EXPECT_EQ(device->service().readDefault("Key"), Found());
}

TEST_P(PreferencesContract, FindsNothingUnderANameThatLeadsElsewhere) {
  device->setPreference("com.vantor.One", "Key", 1);
  for (const char* name : {"", "..", "../Preferences/com.vantor.One", "./com.vantor.One"})
    EXPECT_EQ(device->service().readApplicationPreference(name, "Key"), Found()) << name;
}

TEST_P(PreferencesContract, TellsEverybodyOfAChange) {
  using Changes = std::vector<std::pair<std::string, std::string>>;
  EXPECT_EQ(device->postedChanges(), Changes{});
  device->service().postPreferencesChanged("com.vantor.mobilemail", "MailAccounts");
  device->service().postPreferencesChanged("com.vantor.One", "Key");
  EXPECT_EQ(device->postedChanges(),
            (Changes{{"com.vantor.mobilemail", "MailAccounts"}, {"com.vantor.One", "Key"}}));
}
