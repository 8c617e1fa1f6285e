// What becomes of the entries of the legacy files.
#include <sys/stat.h>

#include <filesystem>

#include "tests/accountsdatamigrator/LegacyImage.h"

namespace accountsdatamigrator {
namespace {

constexpr const char* kMail = "com.vantor.Dataclass.Mail";
constexpr const char* kNotes = "com.vantor.Dataclass.Notes";

using LegacyAccounts = LegacyTest;

Dictionary entryOfClass(const std::string& className) {
  return {{"Class", className}, {"UniqueIdentifier", "I"}};
}

struct ClassCase {
  const char* name;
  const char* file;
  const char* list;
  Dictionary entry;
  const char* type;
};

TEST_F(LegacyAccounts, GetTheTypeOfTheirClassAndHost) {
  const Dictionary gmailByHand = {
      {"Class", "IMAPAccount"}, {"UniqueIdentifier", "I"}, {"Hostname", "imap.gmail.com"}};
  const Dictionary yahooByHand = {
      {"Class", "IMAPAccount"}, {"UniqueIdentifier", "I"}, {"Hostname", "imap.mail.yahoo.com"}};
  const Dictionary popOfGmail = {
      {"Class", "POPAccount"}, {"UniqueIdentifier", "I"}, {"Hostname", "imap.gmail.com"}};
  const std::vector<ClassCase> cases = {
      {"IMAP", kMailFile, "MailAccounts", entryOfClass("IMAPAccount"), "Mail"},
      {"POP", kMailFile, "MailAccounts", entryOfClass("POPAccount"), "Mail"},
      {"AOL", kMailFile, "MailAccounts", entryOfClass("AOLAccount"), "Mail"},
      {"local", kMailFile, "MailAccounts", entryOfClass("LocalAccount"), "Mail"},
      {"Pellix", kMailFile, "MailAccounts", entryOfClass("PellixAccount"), "Mail"},
      {"Quillnet", kMailFile, "MailAccounts", entryOfClass("QuillnetAccount"), "Quillnet"},
      {"Gmail", kMailFile, "MailAccounts", entryOfClass("GmailAccount"), "Gmail"},
      {"Yahoo", kMailFile, "MailAccounts", entryOfClass("YahooAccount"), "Yahoo"},
      {"Brisk", kMailFile, "MailAccounts", entryOfClass("BriskIMAPAccount"), "BriskIMAP"},
      {"outgoing", kMailFile, "OutgoingAccounts", entryOfClass("SMTPAccount"), "SMTP"},
      {"Gmail by host", kMailFile, "MailAccounts", gmailByHand, "Gmail"},
      {"Yahoo by host", kMailFile, "MailAccounts", yahooByHand, "Yahoo"},
      {"the host of another class", kMailFile, "MailAccounts", popOfGmail, "Mail"},
      {"CalDAV", kDataAccessFile, "Accounts", entryOfClass("CalDAVAccount"), "CalDAV"},
      {"CardDAV", kDataAccessFile, "Accounts", entryOfClass("CardDAVAccount"), "CardDAV"},
      {"Exchange", kDataAccessFile, "Accounts", entryOfClass("ExchangeAccount"), "Exchange"},
      {"LDAP", kDataAccessFile, "Accounts", entryOfClass("LDAPAccount"), "LDAP"},
      {"subscription", kDataAccessFile, "Accounts", entryOfClass("SubscribedCalendarAccount"),
       "Subscribed Calendar"},
  };
  for (const ClassCase& c : cases) {
    SCOPED_TRACE(c.name);
    write(c.file, {{c.list, Array{c.entry}}});
    ASSERT_TRUE(execute());
    const Array made = accounts();
    ASSERT_EQ(made.size(), 1U);
    EXPECT_EQ(*propertylist::findString(*made[0].asDictionary(), "Type"), c.type);
    // The library itself keeps it.
    EXPECT_EQ(ASSAccountsManager::init()->allBasicAccounts()->size(), 1U);
    std::filesystem::remove(image.path(c.file));
  }
}

TEST_F(LegacyAccounts, KeepTheirKeysUnderTheSettingsNames) {
  write(kMailFile, {{"MailAccounts", Array{Dictionary{{"Class", "IMAPAccount"},
                                                      {"UniqueIdentifier", "M1"},
                                                      {"AccountName", "Ada"},
                                                      {"AccountPath", "Mail/IMAP-ada"},
                                                      {"Username", "ada"},
                                                      {"Dataclasses", Array{"Notes", kMail}},
                                                      {"Type", "made up"},
                                                      {"ChildAccounts", Array{"x"}},
                                                      {"Port", 993}}}}});
  migrate();
  EXPECT_EQ(settings(),
            (Dictionary{{"Version", 12},
                        {"Accounts", Array{Dictionary{{"AccountPath", "Mail/IMAP-ada"},
                                                      {"Class", "IMAPAccount"},
                                                      {"DisplayName", "Ada"},
                                                      {"Enabled Dataclasses", Array{kNotes, kMail}},
                                                      {"Identifier", "M1"},
                                                      {"Port", 993},
                                                      {"Type", "Mail"},
                                                      {"Username", "ada"}}}}}));
}

TEST_F(LegacyAccounts, WithoutAListHaveAllThatTheirTypeCanHave) {
  write(kDataAccessFile, {{"Accounts", Array{entryOfClass("CalDAVAccount")}}});
  migrate();
  EXPECT_EQ(*accounts()[0].asDictionary()->find("Enabled Dataclasses"),
            propertylist::Value(
                Array{"com.vantor.Dataclass.Calendars", "com.vantor.Dataclass.Reminders"}));
}

TEST_F(LegacyAccounts, ThatCannotBeMadeAreLeftOutWithTheirPlace) {
  write(kMailFile,
        {{"MailAccounts", Array{1, Dictionary(), entryOfClass("OtherAccount"),
                                Dictionary{{"Class", "IMAPAccount"},
                                           {"UniqueIdentifier", "I"},
                                           {"Dataclasses", Array{"Mail", "Contacts", 7}}},
                                entryOfClass("CalDAVAccount")}}});
  migrate();
  const std::string place =
      "AccountMigrator: IMAGE/" + std::string(kMailFile) + ": \"MailAccounts\"";
  Lines lines = log();
  lines.erase(lines.begin(), lines.begin() + 2);
  EXPECT_EQ(lines, (Lines{place + "[0] is left out: it is no dictionary",
                          place + "[1] is left out: it has no string \"Class\"",
                          place + "[2] is left out: its class \"OtherAccount\" is not known",
                          place + "[3]: dataclass Contacts is left out: type \"Mail\" has none",
                          place + "[3]: dataclass 7 is left out: type \"Mail\" has none",
                          place + "[4] is left out: its class \"CalDAVAccount\" is not known",
                          "AccountMigrator: built IMAGE/" + std::string(kSettingsFile) +
                              " with 1 accounts"}));
  EXPECT_EQ(accounts().size(), 1U);
}

TEST_F(LegacyAccounts, OfOneIdentifierAreToldApart) {
  write(kMailFile, {{"MailAccounts", Array{entryOfClass("IMAPAccount")}}});
  write(kDataAccessFile, {{"Accounts", Array{entryOfClass("CalDAVAccount")}}});
  migrate();
  ASSERT_EQ(accounts().size(), 2U);
  EXPECT_EQ(*propertylist::findString(*accounts()[0].asDictionary(), "Identifier"), "I");
  EXPECT_NE(*propertylist::findString(*accounts()[1].asDictionary(), "Identifier"), "I");
  EXPECT_THAT(log(), testing::Contains("AccountMigrator: IMAGE/" + std::string(kDataAccessFile) +
                                       ": \"Accounts\"[0] gets a new identifier: \"I\" is taken"));
}

TEST_F(LegacyAccounts, WithKeysOfAnotherKindGoWithoutThemAndSaySo) {
  write(kMailFile, {{"MailAccounts", Array{Dictionary{{"Class", "IMAPAccount"},
                                                      {"UniqueIdentifier", 7},
                                                      {"Enabled Dataclasses", Array{"x"}},
                                                      {"Dataclasses", "Mail"}}}}});
  ASSERT_TRUE(execute());
  const std::string place =
      "AccountMigrator: IMAGE/" + std::string(kMailFile) + ": \"MailAccounts\"[0]";
  EXPECT_EQ(log(), (Lines{place + " has no use for its \"UniqueIdentifier\": it is no text",
                          place + " has no dataclass enabled: its \"Dataclasses\" is no array",
                          "AccountMigrator: built IMAGE/" + std::string(kSettingsFile) +
                              " with 1 accounts"}));
  const Dictionary account = *accounts()[0].asDictionary();
  EXPECT_EQ(propertylist::findString(account, "Identifier")->size(), 36U);
  EXPECT_EQ(*account.find("Enabled Dataclasses"), propertylist::Value(Array()));
}

TEST_F(LegacyAccounts, AreTheSameEachTimeThatTheyAreMade) {
  const Dictionary nameless = {{"Class", "IMAPAccount"}, {"Username", "ada"}};
  write(kMailFile, {{"MailAccounts", Array{nameless, nameless}}});
  ASSERT_TRUE(execute());
  const auto first = bytesOf(kSettingsFile);
  ASSERT_TRUE(execute());
  EXPECT_EQ(bytesOf(kSettingsFile), first);
  const std::string one = *propertylist::findString(*accounts()[0].asDictionary(), "Identifier");
  const std::string other = *propertylist::findString(*accounts()[1].asDictionary(), "Identifier");
  EXPECT_NE(one, other);
  for (const std::string& made : {one, other}) {
    ASSERT_EQ(made.size(), 36U);
    EXPECT_EQ(made[14], '8');
    EXPECT_THAT(std::string("89AB"), testing::HasSubstr(made.substr(19, 1)));
  }
}

TEST_F(LegacyAccounts, LeaveTheirFilesUntouchedAndTheSettingsPrivate) {
  write(kMailFile, {{"MailAccounts", Array{entryOfClass("IMAPAccount")}}});
  const auto before = bytesOf(kMailFile);
  migrate();
  EXPECT_EQ(bytesOf(kMailFile), before);
  struct stat status = {};
  ASSERT_EQ(::stat(image.path(kSettingsFile).c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0600U);
  EXPECT_EQ(status.st_uid, *image.image->userNumber("mobile"));
  EXPECT_EQ(temporaryFiles(), Lines());
}

}  // namespace
}  // namespace accountsdatamigrator
