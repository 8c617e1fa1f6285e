// What the account services of an image hear of changed accounts.

#include <sys/stat.h>

#include <filesystem>

#include "tests/accountservices/ServicesImage.h"

namespace accountservices {
namespace {

using Notifications = ServicesTest;

AccountPtr record(const Dictionary& properties) {
  return accountsettings::ASSBasicAccount::initWithProperties(properties);
}

std::string line(const std::string& notifier, const std::string& number, const std::string& change,
                 const std::string& account, const std::string& type,
                 const std::string& original = {}) {
  return R"({"notifier": ")" + notifier + R"(", )" + number + R"(, "change": ")" + change +
         R"(", "account": ")" + account + R"(", "type": ")" + type +
         R"(", "originalDataclasses": [)" + (original.empty() ? "" : "\"" + original + "\"") + "]}";
}

TEST_F(Notifications, ReachEachNotifierInOneCallWithDeletedThenAddedThenModifiedAccounts) {
  const auto store =
      storeOf({account("kept", "CalDAV", kCalendars), account("gone", "Exchange", kCalendars),
               account("untouched", "CalDAV", kCalendars)});
  speak();
  rename(*store, "kept");
  store->deleteAccountWithIdentifier("gone");
  store->insertAccount(
      record(account("fresh", "Gmail", {}, {{"Enabled Dataclasses", Array{kCalendars, kMail}}})));
  store->saveAllAccounts();
  EXPECT_EQ(
      image.changes(),
      (Lines{line("CalendarServiceNotifier", R"("record": 1, "of": 3)", "deleted", "gone",
                  "Exchange", kCalendars),
             line("CalendarServiceNotifier", R"("record": 2, "of": 3)", "added", "fresh", "Gmail"),
             line("CalendarServiceNotifier", R"("record": 3, "of": 3)", "modified", "kept",
                  "CalDAV", kCalendars),
             line("MailServiceNotifier", R"("record": 1, "of": 1)", "added", "fresh", "Gmail")}));
  // Nothing has changed since.
  store->saveAllAccounts();
  EXPECT_EQ(image.changes().size(), 4U);
}

TEST_F(Notifications, AreKeptBackUnlessTheFlagIsCleared) {
  const auto store = storeOf({account("1", "CalDAV", kCalendars)});
  rename(*store, "1");
  store->saveAllAccounts();
  EXPECT_EQ(image.changes(), Lines{});
  EXPECT_EQ(platform::registeredClass("CalendarServiceNotifier"), nullptr);
  speak();
  store->saveAllAccounts();
  EXPECT_EQ(image.changes(), (Lines{line("CalendarServiceNotifier", R"("record": 1, "of": 1)",
                                         "modified", "1", "CalDAV", kCalendars)}));
}

TEST_F(Notifications, ReachEveryServiceOfAType) {
  const auto store = storeOf({account(
      "1", "Exchange", {}, {{"Enabled Dataclasses", Array{kCalendars, kContacts, kNotes}}})});
  speak();
  store->accountWithIdentifier("1")->setEnabledForDataclasses({});
  store->saveAllAccounts();
  Lines notifiers;
  for (const std::string& heard : image.changes())
    notifiers.push_back(heard.substr(0, heard.find(',')));
  EXPECT_EQ(notifiers, (Lines{R"({"notifier": "CalendarServiceNotifier")",
                              R"({"notifier": "ContactsServiceNotifier")",
                              R"({"notifier": "MailServiceNotifier")"}));
}

TEST_F(Notifications, OfDataclassesComeBeforeAndAfterAndNameThem) {
  const AccountPtr exchange = record(account("1", "Exchange"));
  ASSAccountsManager::accountWillChangeForDataclass(exchange, kContacts);
  ASSAccountsManager::accountDidChangeForDataclass(exchange, kContacts);
  ASSAccountsManager::accountDidChangeForDataclass(exchange, "com.vantor.Dataclass.Bookmarks");
  EXPECT_EQ(image.changes(),
            (Lines{R"({"notifier": "ContactsServiceNotifier", "change": "will change", )"
                   R"("account": "1", "dataclass": "com.vantor.Dataclass.Contacts"})",
                   R"({"notifier": "ContactsServiceNotifier", "change": "did change", )"
                   R"("account": "1", "dataclass": "com.vantor.Dataclass.Contacts"})"}));
}

TEST_F(Notifications, LeaveTheJournalToItsOwner) {
  std::filesystem::remove(image.root() + "/var/log/account-changes.jsonl");
  ::umask(0);
  ASSAccountsManager::accountDidChangeForDataclass(record(account("1", "CalDAV")), kCalendars);
  EXPECT_EQ(image.changes().size(), 1U);
  struct stat status {};
  ASSERT_EQ(::stat((image.root() + "/var/log/account-changes.jsonl").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0600U);
}

TEST_F(Notifications, ThatCannotBeNotedBecomeALineOfTheSystemLog) {
  const std::string journal = image.root() + "/var/log/account-changes.jsonl";
  std::filesystem::remove(journal);
  std::filesystem::create_directory(journal);
  ASSAccountsManager::accountDidChangeForDataclass(record(account("1", "CalDAV")), kCalendars);
  const Lines lines = image.journal("var/log/system.log");
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_THAT(
      lines.front(),
      testing::EndsWith("]: Could not note in var/log/account-changes.jsonl what an account "
                        "service heard: the file cannot be written"));
}

TEST_F(Notifications, OfAServiceThatIsAbsentAreABrokenInstallationWithTheFileWritten) {
  image.removeBundle("CalendarService.so");
  const auto store = storeOf({account("1", "CalDAV", kCalendars)});
  speak();
  rename(*store, "1");
  const std::string path = image.bundlePath("CalendarService.so");
  expectFailure("Could not load the account creator framework " + path + ". Error " + path +
                    ": cannot open shared object file: No such file or directory",
                [&] { store->saveAllAccounts(); });
  EXPECT_EQ(image.savedAccounts(),
            Array{account("1", "CalDAV", kCalendars, {{"DisplayName", "new"}})});
  EXPECT_EQ(image.leftovers(), Lines{});
}

}  // namespace
}  // namespace accountservices
