// Bringing a settings file of an older version up to date.
#include "tests/accountsdatamigrator/LegacyImage.h"

namespace accountsdatamigrator {
namespace {

using OlderSettings = LegacyTest;

TEST_F(OlderSettings, KeepEveryAccountAndEveryKey) {
  const Array old = {Dictionary{{"Identifier", "A"}, {"Type", "unheard of"}, {"odd", 1}}, 7,
                     Dictionary{{"Identifier", "B"}, {"ChildAccounts", "none"}}};
  write(kSettingsFile, {{"Version", 7}, {"Accounts", old}, {"odd", true}});
  migrate();
  EXPECT_EQ(settings(), (Dictionary{{"Version", 12}, {"Accounts", old}, {"odd", true}}));
}

TEST_F(OlderSettings, GiveAccountsAndChildrenWithoutIdentifierOne) {
  write(
      kSettingsFile,
      {{"Version", 7},
       {"Accounts", Array{Dictionary{{"Type", "Exchange"},
                                     {"Identifier", 7},
                                     {"ChildAccounts", Array{Dictionary{{"Type", "OnMyDevice"}}}}},
                          Dictionary{{"Type", "OnMyDevice"}}}}});
  migrate();
  const Dictionary first = *accounts()[0].asDictionary();
  const Dictionary child = *(*propertylist::findArray(first, "ChildAccounts"))[0].asDictionary();
  EXPECT_EQ(propertylist::findString(first, "Identifier")->size(), 36U);
  EXPECT_EQ(propertylist::findString(child, "Identifier")->size(), 36U);
  EXPECT_EQ(accounts()[1], propertylist::Value(Dictionary{{"Type", "OnMyDevice"}}));
}

TEST_F(OlderSettings, WithoutAListStayWithoutOne) {
  write(kSettingsFile, {{"Version", 0}});
  migrate();
  EXPECT_EQ(settings(), (Dictionary{{"Version", 12}}));
}

TEST_F(OlderSettings, OfANegativeVersionAreNotOld) {
  write(kSettingsFile, {{"Version", -1}});
  migrate();
  EXPECT_EQ(settings(), (Dictionary{{"Version", -1}}));
  EXPECT_EQ(log(), Lines());
}

}  // namespace
}  // namespace accountsdatamigrator
