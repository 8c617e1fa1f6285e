#include "deviceimage/SyncAgent.h"

#include <gtest/gtest.h>

#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using propertylist::Array;
using propertylist::Dictionary;

const Dictionary kQuillnet = {{"Type", "Quillnet"}, {"Identifier", "q"}, {"Sync Identifier", "s"}};

Dictionary child(const char* itsClass, const char* identifier) {
  return {{"Class", itsClass}, {"Identifier", identifier}};
}

TEST(SyncAgent, NamesQuillnetStoresByTheAgentsOwnAccountName) {
  const SyncAgent agent(std::optional<std::string>("ada"));
  const Dictionary vantor = {{"Type", "VantorAccount"}, {"Identifier", "v"}};
  for (const Dataclass dataclass : kDataclasses) {
    EXPECT_EQ(agent.storeIdentifier(kQuillnet, dataclass), "Quillnet:ada");
    EXPECT_EQ(agent.storeIdentifier(vantor, dataclass), "Quillnet:ada");
  }
  EXPECT_EQ(SyncAgent(std::nullopt).storeIdentifier(kQuillnet, Dataclass::notes), std::nullopt);
}

TEST(SyncAgent, FindsTheEventsOfAQuillnetAccountUnderItsCalendarChild) {
  Dictionary account = kQuillnet;
  account.set("ChildAccounts",
              Array{child("MobileCalDAVAccount", "2"), child("MobileCalDAVAccount", "1"),
                    child("IMAPNotesAccount", "0"), "no account"});
  const SyncAgent agent(std::optional<std::string>("ada"));
  EXPECT_EQ(agent.storeIdentifier(account, Dataclass::calendars), "1");
  EXPECT_EQ(agent.storeIdentifier(account, Dataclass::reminders), "Quillnet:ada");
  EXPECT_EQ(SyncAgent(std::nullopt).storeIdentifier(account, Dataclass::calendars), "1");
}

TEST(SyncAgent, NamesOtherStoresByTheAccountsSyncIdentifierElseItsIdentifier) {
  const SyncAgent agent(std::optional<std::string>("ada"));
  const Dictionary both = {{"Type", "CardDAV"}, {"Identifier", "i"}, {"Sync Identifier", "s"}};
  const Dictionary one = {{"Type", "CardDAV"}, {"Identifier", "i"}};
  EXPECT_EQ(agent.storeIdentifier(both, Dataclass::contacts), "s");
  EXPECT_EQ(agent.storeIdentifier(one, Dataclass::contacts), "i");
  EXPECT_EQ(agent.storeIdentifier({{"Type", "CardDAV"}}, Dataclass::contacts), std::nullopt);
}

TEST(SyncAgent, PassesOverEmptyIdentifiers) {
  const SyncAgent agent(std::nullopt);
  EXPECT_EQ(
      agent.storeIdentifier({{"Type", "CardDAV"}, {"Identifier", "i"}, {"Sync Identifier", ""}},
                            Dataclass::contacts),
      "i");
  EXPECT_EQ(agent.storeIdentifier({{"Type", "CardDAV"}, {"Identifier", ""}}, Dataclass::contacts),
            std::nullopt);
}

TEST(SyncAgent, ReadsItsAccountNameFromItsPreferencesWhenThatIsAString) {
  const TemporaryImage image;
  EXPECT_EQ(SyncAgent(*image.image).accountName(), std::nullopt);
  const std::string file = *DeviceImage::preferencesFile("com.vantor.OTASyncAgent");
  ASSERT_EQ(image.image->writePropertyList(file, Dictionary{{"AccountName", "ada"}}).code, 0);
  EXPECT_EQ(SyncAgent(*image.image).accountName(), "ada");
  ASSERT_EQ(image.image->writePropertyList(file, Dictionary{{"AccountName", 7}}).code, 0);
  EXPECT_EQ(SyncAgent(*image.image).accountName(), std::nullopt);
}

}  // namespace
}  // namespace deviceimage
