// When the local stores are shown: unless another account serves the dataclass and there is no
// local data of it.

#include "QuillnetAccountTypeRemoval/ASSDeviceLocalAccount.h"
#include "localdata/LocalStores.h"
#include "tests/localdata/LocalDataTest.h"

namespace localdata {
namespace {

using accountsettings::ASSDeviceLocalAccount;
using accountsettings::DeviceLocalAccountPtr;
using RecordKind = platform::InMemorySyncDataSource::RecordKind;

// All local stores are hidden, and the device holds no local data.
class ShowingLocalStores : public LocalDataTest {
 protected:
  ShowingLocalStores() {
    device.contactsStore.sources = {{"local", false, true}};
    device.calendarStore.contents.stores = {{"local", true, false, false}};
  }
  void putLocalRecord(const std::string& name, RecordKind kind) {
    device.syncDataSource.stores[{std::nullopt, name}].records.push_back({"1", "one", kind});
  }
  bool contactsAreShown() const { return device.contactsStore.isSourceEnabled("local"); }
  bool eventsAreShown() const { return device.calendarStore.storeNamed("local")->allowsEvents; }
  bool remindersAreShown() const {
    return device.calendarStore.storeNamed("local")->allowsReminders;
  }
  bool everythingIsHidden() const {
    return !contactsAreShown() && !eventsAreShown() && !remindersAreShown();
  }
};

const platform::CallJournal kShowingContacts = {
    "openAddressBook()", "allSourcesIncludingDisabled()", "localSource()",
    "setSourceEnabled(local, true)", "saveAddressBook()"};
const platform::CallJournal kShowingEvents = {"openCalendarDatabase(20)",
                                              "allStores()",
                                              "localStore()",
                                              "setStoreAllowsEvents(local, true)",
                                              "ensureWritableCalendarForEntityType(events, local)",
                                              "saveCalendarDatabase()"};

TEST_F(ShowingLocalStores, ContactsAreShownWithoutAQuestionWhenNoAccountServesThem) {
  writeAccounts({deviceLocalInfo({"Contacts"}), accountInfo("Mail", "m", {"Mail"})});
  EXPECT_TRUE(enableAddressBookLocalStore(false));
  EXPECT_EQ(device.journal, kShowingContacts);
  EXPECT_EQ(settingsReads(), 1U);
}

TEST_F(ShowingLocalStores, ContactsStayHiddenWhenAnAccountServesThemAndNoneAreLocal) {
  writeAccounts({accountInfo("Quillnet", "about to be retired", {"Contacts"})});
  EXPECT_TRUE(enableAddressBookLocalStore(false));
  EXPECT_EQ(device.journal,
            (Journal{"dataclassNameForSyncType(Contacts)", "createDataSource(Contacts, none, none)",
                     "countRecords(local Contacts)", "deleteDataSource(local Contacts)"}));
  EXPECT_TRUE(everythingIsHidden());
}

TEST_F(ShowingLocalStores, HiddenMeansLeftAsItIsNotHiddenNow) {
  device.contactsStore.sources = {{"local", true, true}};
  writeAccounts({accountInfo("Quillnet", "q", {"Contacts"})});
  EXPECT_TRUE(enableAddressBookLocalStore(false));
  EXPECT_TRUE(contactsAreShown());
}

TEST_F(ShowingLocalStores, ContactsAreShownWhenThereAreLocalOnes) {
  writeAccounts({accountInfo("Quillnet", "q", {"Contacts"})});
  putLocalRecord("Contacts", RecordKind::any);
  EXPECT_TRUE(enableAddressBookLocalStore(false));
  EXPECT_TRUE(contactsAreShown());
}

TEST_F(ShowingLocalStores, ForceShowsWithoutAskingForLocalData) {
  writeAccounts({accountInfo("Quillnet", "q", {"Contacts", "Calendars", "Reminders"})});
  EXPECT_TRUE(enableAddressBookLocalStore(true));
  EXPECT_EQ(device.journal, kShowingContacts);
  EXPECT_TRUE(enableCalendarLocalStore(true));
  EXPECT_TRUE(enableRemindersLocalStore(true));
  EXPECT_TRUE(contactsAreShown() && eventsAreShown() && remindersAreShown());
  EXPECT_EQ(device.syncDataSource.calls(), Journal{});
  EXPECT_EQ(settingsReads(), 3U);
}

TEST_F(ShowingLocalStores, ContactsAnswerWhetherTheyWereSavedAndTheOthersTrue) {
  device.contactsStore.failEvery("saveAddressBook", Status::failure(1, "disk full"));
  device.calendarStore.failEvery("saveCalendarDatabase");
  EXPECT_FALSE(enableAddressBookLocalStore(false));
  EXPECT_TRUE(enableCalendarLocalStore(false));
  EXPECT_TRUE(enableRemindersLocalStore(false));
  EXPECT_EQ(device.logLines(), (Lines{"Failed to hide the AB local source. Error = disk full"}));
}

TEST_F(ShowingLocalStores, EventsAndRemindersAreShownApart) {
  EXPECT_TRUE(enableCalendarLocalStore(false));
  EXPECT_EQ(device.journal, kShowingEvents);
  EXPECT_TRUE(eventsAreShown());
  EXPECT_FALSE(remindersAreShown());
  device.journal.clear();
  EXPECT_TRUE(enableRemindersLocalStore(false));
  EXPECT_EQ(device.journal,
            (Journal{"openCalendarDatabase(20)", "allStores()", "localStore()",
                     "setStoreAllowsReminders(local, true)",
                     "ensureWritableCalendarForEntityType(reminders, local)",
                     "ensureDefaultCalendarForNewReminders()", "saveCalendarDatabase()"}));
  EXPECT_TRUE(remindersAreShown());
}

TEST_F(ShowingLocalStores, EventsAndRemindersStayHiddenWhenServedAndNotLocal) {
  writeAccounts({accountInfo("CalDAV", "c", {"Calendars", "Reminders"})});
  putLocalRecord("Contacts", RecordKind::any);
  EXPECT_TRUE(enableCalendarLocalStore(false));
  EXPECT_TRUE(enableRemindersLocalStore(false));
  EXPECT_EQ(device.calendarStore.calls(), Journal{});
  EXPECT_TRUE(everythingIsHidden());
}

TEST_F(ShowingLocalStores, EventsThatAreLocalShowEventsAndNotReminders) {
  writeAccounts({accountInfo("CalDAV", "c", {"Calendars", "Reminders"})});
  putLocalRecord("Calendars", RecordKind::event);
  enableCalendarLocalStore(false);
  enableRemindersLocalStore(false);
  EXPECT_TRUE(eventsAreShown());
  EXPECT_FALSE(remindersAreShown());
}

TEST_F(ShowingLocalStores, SubscribedCalendarAloneDoesNotServeCalendars) {
  writeAccounts({accountInfo("Subscribed Calendar", "s", {"Calendars"})});
  EXPECT_TRUE(enableCalendarLocalStore(false));
  EXPECT_TRUE(eventsAreShown());
}

TEST_F(ShowingLocalStores, AccountBehindASubscribedCalendarServesCalendars) {
  writeAccounts({accountInfo("Subscribed Calendar", "s", {"Calendars"}),
                 accountInfo("CalDAV", "c", {"Calendars"})});
  EXPECT_TRUE(enableCalendarLocalStore(false));
  EXPECT_FALSE(eventsAreShown());
}

// The catalogue of the product gives a subscribed calendar no other dataclass than calendars, so a
// catalogue of the test's own does.
TEST_F(ShowingLocalStores, SubscribedCalendarServesContactsAndRemindersLikeAnyAccount) {
  useAccountTypes({{"Subscribed Calendar", Dictionary{{"Supported Dataclasses",
                                                       dataclasses({"Contacts", "Reminders"})}}}});
  writeAccounts({accountInfo("Subscribed Calendar", "s", {"Contacts", "Reminders"})});
  EXPECT_TRUE(enableAddressBookLocalStore(false));
  EXPECT_TRUE(enableRemindersLocalStore(false));
  EXPECT_TRUE(everythingIsHidden());
}

TEST_F(ShowingLocalStores, DataclassThatAnAccountMayNotUseIsNotServed) {
  const Value notContacts = dataclasses({"Notes"});
  writeAccounts({
      with(accountInfo("Quillnet", "not granted", {"Contacts"}),
           {{"Provisioned Dataclasses", notContacts}}),
      accountInfo("CalDAV", "not of its type", {"Contacts"}),
      {Dictionary{{"Type", "CardDAV"}, {"Class", "C"}, {"Identifier", "nothing stored"}}},
  });
  EXPECT_TRUE(enableAddressBookLocalStore(false));
  EXPECT_TRUE(contactsAreShown());
}

TEST_F(ShowingLocalStores, ChildAccountServesNothing) {
  const Dictionary child = accountInfo("CardDAV", "child", {"Contacts"});
  writeAccounts(
      {with(accountInfo("Mail", "m", {"Mail"}), {{"ChildAccounts", Array{Value(child)}}})});
  EXPECT_TRUE(enableAddressBookLocalStore(false));
  EXPECT_TRUE(contactsAreShown());
}

TEST_F(ShowingLocalStores, LocalDataThatCannotBeCountedShowsTheStore) {
  writeAccounts({accountInfo("Quillnet", "q", {"Contacts"})});
  device.syncDataSource.failNext("createDataSource", Status::failure(1, "refused"));
  EXPECT_TRUE(enableAddressBookLocalStore(false));
  EXPECT_TRUE(contactsAreShown());
  EXPECT_EQ(device.logLines(), (Lines{"Error creating data source. Error = refused"}));
}

class DeviceLocalStores : public ShowingLocalStores {
 protected:
  DeviceLocalAccountPtr account =
      ASSDeviceLocalAccount::initWithProperties(ASSDeviceLocalAccount::basicAccountProperties());
};

TEST_F(DeviceLocalStores, EachDataclassShowsItsOwnStoreUnlessItIsServed) {
  account->showLocalStoreIfAppropriateForDataclass("com.vantor.Dataclass.Contacts");
  EXPECT_TRUE(contactsAreShown() && !eventsAreShown() && !remindersAreShown());
  account->showLocalStoreIfAppropriateForDataclass("com.vantor.Dataclass.Calendars");
  EXPECT_TRUE(eventsAreShown() && !remindersAreShown());
  account->showLocalStoreIfAppropriateForDataclass("com.vantor.Dataclass.Reminders");
  EXPECT_TRUE(remindersAreShown());
}

TEST_F(DeviceLocalStores, ShowingIsNotForced) {
  writeAccounts({accountInfo("Quillnet", "q", {"Contacts", "Calendars", "Reminders"})});
  for (const char* name : {"Contacts", "Calendars", "Reminders"})
    account->showLocalStoreIfAppropriateForDataclass(std::string("com.vantor.Dataclass.") + name);
  EXPECT_TRUE(everythingIsHidden());
}

TEST_F(DeviceLocalStores, OtherDataclassesTouchNothing) {
  for (const char* name : {"Bookmarks", "Notes", "Mail", "Backup"}) {
    account->showLocalStoreIfAppropriateForDataclass(std::string("com.vantor.Dataclass.") + name);
    account->hideLocalStoreForDataclass(std::string("com.vantor.Dataclass.") + name);
  }
  EXPECT_EQ(device.journal, Journal{});
  EXPECT_EQ(settingsReads(), 0U);
}

TEST_F(DeviceLocalStores, HidingHidesAlsoTheOnlyStoreAndReadsNoSettings) {
  device.contactsStore.sources = {{"local", true, true}};
  device.calendarStore.contents.stores = {{"local", true, true, true}};
  account->hideLocalStoreForDataclass("com.vantor.Dataclass.Calendars");
  EXPECT_TRUE(contactsAreShown() && !eventsAreShown() && remindersAreShown());
  account->hideLocalStoreForDataclass("com.vantor.Dataclass.Reminders");
  EXPECT_TRUE(contactsAreShown() && !remindersAreShown());
  account->hideLocalStoreForDataclass("com.vantor.Dataclass.Contacts");
  EXPECT_FALSE(contactsAreShown());
  EXPECT_EQ(settingsReads(), 0U);
}

}  // namespace
}  // namespace localdata
