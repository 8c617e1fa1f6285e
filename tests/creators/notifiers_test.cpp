#include "platform/testing/ForwardingClassRegistry.h"
#include "tests/creators/CreatorsDevice.h"

namespace accountsettings {
namespace {

StringList namesFor(const std::string& type, std::string_view dataclass) {
  return TellingStore::_notifierClassNamesForAccountTypeDataclass(type, dataclass);
}

class Notifiers : public testing::Test {
 protected:
  CreatorsDevice device;
};

TEST_F(Notifiers, NeedAListForTheType) {
  device.setCreators({{"Mail", Array{}}});
  expectStoreFailure(
      "Malformed AccountCreators information. Could not find the information for the type CalDAV",
      820, [] { namesFor("CalDAV", kContacts); });
}

TEST_F(Notifiers, NameAMissingTypeAsSuch) {
  device.setCreators({{"Mail", Array{}}});
  const std::string text =
      "Malformed AccountCreators information. Could not find the information for the type (null)";
  const auto account = calendarAccount();
  account->removeAccountPropertyForKey("Type");
  expectStoreFailure(
      text, 820, [&] { ASSAccountsManager::accountWillChangeForDataclass(account, kContacts); });
  expectStoreFailure(text, 820,
                     [&] { ASSAccountsManager::accountDidChangeForDataclass(account, kContacts); });
  expectStoreFailure(text, 820, [] {
    TellingStore::NotificationTable table;
    TellingStore::ofFile()
        ->_addNotificationToDictionaryForChangeTypeOriginalPropertiesCurrentProperties(
            table, AccountChangeType::added, std::nullopt,
            Dictionary{{"Enabled Dataclasses", Array{kContacts}}});
  });
}

TEST_F(Notifiers, AreAllTakenInOrderWithDuplicatesKept) {
  device.setCreators(
      {{"CalDAV", Array{notifier("Z", {kContacts}), notifier("A", {kNotes}),
                        notifier("M", {kNotes, kContacts}),
                        creator("FullAccount", kFullAccounts, "F"), notifier("Z", {kContacts})}}});
  EXPECT_EQ(namesFor("CalDAV", kContacts), (StringList{"Z", "M", "Z"}));
  EXPECT_TRUE(notifiersAreLoaded());
  EXPECT_FALSE(fullAccountsAreLoaded());
}

TEST_F(Notifiers, HaveTheirBundlesLoadedAtEachLookup) {
  class NotingRegistry : public platform::ForwardingClassRegistry {
   public:
    using ForwardingClassRegistry::ForwardingClassRegistry;
    std::optional<std::string> loadLibrary(const std::string& path) override {
      loaded.push_back(path);
      return ForwardingClassRegistry::loadLibrary(path);
    }
    Lines loaded;
  };
  platform::ProcessClassRegistry real;
  NotingRegistry registry(real);
  device.use<platform::ClassRegistry>(registry);
  device.setCreators({{"CalDAV", Array{notifier("A", {kContacts}), notifier("B", {kContacts})}}});
  namesFor("CalDAV", kContacts);
  namesFor("CalDAV", kContacts);
  EXPECT_EQ(registry.loaded, Lines(4, device.bundlePath(kNotifiers)));
}

TEST_F(Notifiers, AreSkippedInSilenceWithoutADescriptionOrTheDataclass) {
  device.setCreators(
      {{"CalDAV", Array{Dictionary{{"Type", "NotifierAccount"}}, Dictionary{}, "no entry",
                        entry("NotifierAccount", {{"Class", "A"}}),
                        entry("NotifierAccount", {{"Supported Dataclasses", Array{kNotes}}})}}});
  EXPECT_EQ(namesFor("CalDAV", kContacts), StringList{});
  EXPECT_FALSE(notifiersAreLoaded());
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(Notifiers, SayWhatIsMissingFromAMatchingEntry) {
  const Array contacts{kContacts};
  device.setCreators(
      {{"CalDAV",
        Array{entry("NotifierAccount", {{"Supported Dataclasses", contacts}, {"Class", "A"}})}},
       {"Mail", Array{notifier("", contacts)}},
       {"LDAP", Array{entry("NotifierAccount",
                            {{"Supported Dataclasses", contacts}, {"Framework", kNotifiers}})}},
       {"SMTP", Array{entry("NotifierAccount", {{"Supported Dataclasses", contacts},
                                                {"Framework", "/Library/Missing.so"},
                                                {"Class", "A"}})}}});
  expectStoreFailure(
      "Malformed AccountCreators information. Could not find the path to the framework for the "
      "notifier with type CalDAV",
      829, [] { namesFor("CalDAV", kContacts); });
  const std::string path = device.root() + "/Library/Missing.so";
  expectStoreFailure("Could not load the account creator framework " + path + ". Error " + path +
                         ": cannot open shared object file: No such file or directory",
                     834, [] { namesFor("SMTP", kContacts); });
  ASSERT_FALSE(notifiersAreLoaded());
  for (const char* type : {"Mail", "LDAP"}) {
    expectStoreFailure(
        std::string("Malformed AccountCreators information. Could not find the name of the class "
                    "for notificatinos with the type ") +
            type,
        842, [&] { namesFor(type, kContacts); });
  }
  EXPECT_TRUE(notifiersAreLoaded());  // the class is looked at after that
}

TEST_F(Notifiers, AreToldTheIdentifierAlthoughNotificationsAreSkipped) {
  device.setCreators({{"CalDAV", Array{notifier("FullNotifier", {kContacts}),
                                       notifier("ChangesNotifier", {kContacts}),
                                       notifier("FullNotifier", {kContacts})}}});
  ASSAccountsManager::_setShouldSkipNotifications(true);
  ASSAccountsManager::accountWillChangeForDataclass(calendarAccount("a"), kContacts);
  ASSAccountsManager::accountDidChangeForDataclass(calendarAccount("b"), kContacts);
  ASSAccountsManager::accountDidChangeForDataclass(calendarAccount("b"), kNotes);
  // Listed twice is told twice; ChangesNotifier does not listen.
  EXPECT_EQ(diaryLines(), (Lines{"willChange(a, com.vantor.Dataclass.Contacts)",
                                 "willChange(a, com.vantor.Dataclass.Contacts)",
                                 "didChange(b, com.vantor.Dataclass.Contacts)",
                                 "didChange(b, com.vantor.Dataclass.Contacts)"}));
}

TEST_F(Notifiers, NeedTheirClassToBeThere) {
  device.setCreators(
      {{"CalDAV", Array{notifier("FullNotifier", {kContacts}), notifier("Missing", {kContacts})}}});
  expectStoreFailure("Could not find a class for class name Missing", 638, [] {
    ASSAccountsManager::accountWillChangeForDataclass(calendarAccount(), kContacts);
  });
  expectStoreFailure("Could not find a class for class name Missing", 652, [] {
    ASSAccountsManager::accountDidChangeForDataclass(calendarAccount(), kContacts);
  });
  EXPECT_EQ(diaryLines(), (Lines{"willChange(1, com.vantor.Dataclass.Contacts)",
                                 "didChange(1, com.vantor.Dataclass.Contacts)"}));
}

TEST_F(Notifiers, OnlySubscribedCalendarsHaveAGroupName) {
  const auto name = [](std::string_view type, bool beginning) {
    return ASSAccountsManager::displayNameForGroupOfAccountTypeForBeginningOfSentence(type,
                                                                                      beginning);
  };
  EXPECT_EQ(name("CalDAV", true), std::nullopt);
  EXPECT_EQ(name("subscribed calendar", false), std::nullopt);
  // Without a table of texts the keys come out.
  EXPECT_EQ(name("Subscribed Calendar", true), "SUBSCRIBED_CALENDAR_GROUP_TITLE");
  EXPECT_EQ(name("Subscribed Calendar", false), "SUBSCRIBED_CALENDAR_GROUP_MID_SENTENCE_TITLE");
  // These texts are of one table alone.
  device.bundleResources.texts["AccountsManager"] = {
      {"SUBSCRIBED_CALENDAR_GROUP_TITLE", "At the beginning"},
      {"SUBSCRIBED_CALENDAR_GROUP_MID_SENTENCE_TITLE", "in the middle"}};
  EXPECT_EQ(name("Subscribed Calendar", true), "At the beginning");
  EXPECT_EQ(name("Subscribed Calendar", false), "in the middle");
  device.bundleResources.texts.clear();
  device.setResourcesDirectory(SHIPPED_RESOURCES);
  EXPECT_EQ(name("Subscribed Calendar", true), "Subscribed Calendars");
  EXPECT_EQ(name("Subscribed Calendar", false), "subscribed calendars");
}

}  // namespace
}  // namespace accountsettings
