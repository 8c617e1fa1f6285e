// Refreshes, which the account services of an image answer.

#include <filesystem>

#include "tests/accountservices/ServicesImage.h"

namespace accountservices {
namespace {

using Refreshes = ServicesTest;

AccountPtr record(const std::string& identifier, const std::string& type) {
  return accountsettings::ASSBasicAccount::initWithProperties(account(identifier, type));
}

TEST_F(Refreshes, AreAnsweredAndNotedByTheSyncAccount) {
  const AccountPtr calendar = record("cal", "CalDAV");
  EXPECT_TRUE(calendar->refreshContainerWithIdentifierForDataclassIsUserRequested(
      "home \"1\"", kCalendars, true));
  EXPECT_TRUE(calendar->refreshContainerListForDataclassIsUserRequested(
      "com.vantor.Dataclass.Reminders", true));
  EXPECT_TRUE(calendar->refreshContainersForDataclass(kCalendars));
  EXPECT_FALSE(calendar->refreshContainersForDataclass(kMail));
  EXPECT_EQ(
      image.refreshes(),
      (Lines{R"({"service": "CalendarService", "account": "cal", "request": "container", )"
             R"("container": "home \"1\"", "dataclass": "com.vantor.Dataclass.Calendars", )"
             R"("userRequested": true, "answer": true})",
             R"({"service": "CalendarService", "account": "cal", "request": "container list", )"
             R"("dataclass": "com.vantor.Dataclass.Reminders", "userRequested": true, )"
             R"("answer": true})",
             R"({"service": "CalendarService", "account": "cal", "request": "containers", )"
             R"("dataclass": "com.vantor.Dataclass.Calendars", "userRequested": false, )"
             R"("answer": true})",
             R"({"service": "CalendarService", "account": "cal", "request": "containers", )"
             R"("dataclass": "com.vantor.Dataclass.Mail", "userRequested": false, )"
             R"("answer": false})"}));
}

TEST_F(Refreshes, AreAnsweredForTheDataclassesThatTheServiceCarries) {
  const struct {
    const char* type;
    const char* dataclass;
    bool answer;
  } kCases[] = {
      {"CalDAV", kCalendars, true},
      {"CalDAV", kContacts, false},
      {"Subscribed Calendar", kCalendars, true},
      {"Subscribed Calendar", kMail, false},
      {"CardDAV", kContacts, true},
      {"CardDAV", kCalendars, false},
      {"Mail", kMail, true},
      {"Mail", kContacts, false},
      {"BriskIMAP", kNotes, true},
      {"IMAPNotes", kNotes, true},
      {"Gmail", kMail, true},
      {"Gmail", kCalendars, true},
      {"Yahoo", kContacts, true},
      {"Exchange", kNotes, true},
      {"Exchange", "com.vantor.Dataclass.Bookmarks", false},
  };
  for (const auto& c : kCases) {
    SCOPED_TRACE(std::string(c.type) + ", " + c.dataclass);
    EXPECT_EQ(record("1", c.type)->refreshContainersForDataclass(c.dataclass), c.answer);
  }
  EXPECT_EQ(image.refreshes().size(), std::size(kCases));
}

TEST_F(Refreshes, AreNotAnsweredWithoutASyncAccount) {
  for (const char* type :
       {"LDAP", "SMTP", "OnMyDevice", "Quillnet", "VantorAccount", "BookmarkDAV"}) {
    SCOPED_TRACE(type);
    EXPECT_FALSE(record("1", type)->refreshContainersForDataclass(kContacts));
  }
  EXPECT_EQ(image.refreshes(), Lines{});
  EXPECT_EQ(image.journal("var/log/system.log"), Lines{});
}

TEST_F(Refreshes, ThatCannotBeNotedAreAnsweredAndLogged) {
  const AccountPtr calendar = record("cal", "CalDAV");
  EXPECT_TRUE(calendar->refreshContainersForDataclass(kCalendars));
  std::filesystem::rename(image.root() + "/var/mobile/Library", image.root() + "/moved");
  EXPECT_TRUE(calendar->refreshContainersForDataclass(kCalendars));
  EXPECT_EQ(image.refreshes().size(), 1U);
  const Lines log = image.journal("var/log/system.log");
  ASSERT_EQ(log.size(), 1U);
  EXPECT_THAT(log[0],
              testing::HasSubstr("Could not note in var/log/refreshes.jsonl what an account "
                                 "service heard: \"" +
                                 image.root() + "\" is no device image"));
}

}  // namespace
}  // namespace accountservices
