// Showing and hiding the local contacts source and the local calendar store.

#include "localdata/LocalStores.h"

#include "tests/localdata/LocalDataTest.h"

namespace localdata {
namespace {

constexpr const char* kCalendars = "com.vantor.Dataclass.Calendars";
constexpr const char* kReminders = "com.vantor.Dataclass.Reminders";

class LocalStores : public LocalDataTest {
 protected:
  using Calendars = platform::InMemoryCalendarStore;
  void addOtherSourceAndStore() {
    device.contactsStore.sources.push_back({"other", false, false});
    device.calendarStore.contents.stores.push_back({"other"});
  }
  const Calendars::Store& localStore() const { return *device.calendarStore.storeNamed("local"); }
};

using LocalContactsSource = LocalStores;
using LocalCalendarStore = LocalStores;

TEST_F(LocalContactsSource, IsSetAndSavedWithForceEvenWhenItIsTheOnlyOne) {
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(false, true));
  EXPECT_EQ(device.journal,
            (Journal{"openAddressBook()", "allSourcesIncludingDisabled()", "localSource()",
                     "setSourceEnabled(local, false)", "saveAddressBook()"}));
  EXPECT_FALSE(device.contactsStore.isSourceEnabled("local"));
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(true, true));
  EXPECT_TRUE(device.contactsStore.isSourceEnabled("local"));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalContactsSource, IsLeftAloneWithoutForceWhenItIsTheOnlyOne) {
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(false, false));
  EXPECT_EQ(device.journal, (Journal{"openAddressBook()", "allSourcesIncludingDisabled()"}));
  EXPECT_TRUE(device.contactsStore.isSourceEnabled("local"));
}

TEST_F(LocalContactsSource, CountsDisabledSourcesAsOthers) {
  addOtherSourceAndStore();
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(false, false));
  EXPECT_FALSE(device.contactsStore.isSourceEnabled("local"));
}

TEST_F(LocalContactsSource, WithoutAListOfSourcesOnlyForceSetsIt) {
  addOtherSourceAndStore();
  device.contactsStore.failEvery("allSources");
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(false, false));
  EXPECT_TRUE(device.contactsStore.isSourceEnabled("local"));
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(false, true));
  EXPECT_FALSE(device.contactsStore.isSourceEnabled("local"));
}

TEST_F(LocalContactsSource, NothingIsDoneWithoutAnAddressBook) {
  device.contactsStore.failNext("openAddressBook");
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(false, true));
  EXPECT_EQ(device.journal, (Journal{"openAddressBook()"}));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalContactsSource, NothingIsSavedWithoutALocalSource) {
  device.contactsStore.sources = {{"a"}, {"b"}};
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(false, false));
  EXPECT_EQ(device.journal,
            (Journal{"openAddressBook()", "allSourcesIncludingDisabled()", "localSource()"}));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalContactsSource, FailedSaveIsToldInOneTextForShowingAndHiding) {
  device.contactsStore.failEvery("saveAddressBook", Status::failure(1, "disk full"));
  EXPECT_FALSE(setAddressBookLocalSourceEnabled(true, true));
  EXPECT_FALSE(setAddressBookLocalSourceEnabled(false, true));
  EXPECT_EQ(device.logLines(), (Lines{"Failed to hide the AB local source. Error = disk full",
                                      "Failed to hide the AB local source. Error = disk full"}));
}

TEST_F(LocalContactsSource, FailedSaveWithoutAnErrorCountsAsDone) {
  device.contactsStore.failEvery("saveAddressBook", Status{1, std::nullopt});
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(false, true));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalContactsSource, SuccessfulSaveWithAnErrorCountsAsDone) {
  const Status successWithError{0, platform::Error{"a warning"}};
  device.contactsStore.answerNext("saveAddressBook", {successWithError, true});
  EXPECT_TRUE(setAddressBookLocalSourceEnabled(false, true));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalContactsSource, DisablingHidesItAndAnswersWhetherThatWasSaved) {
  EXPECT_TRUE(disableAddressBookLocalStore(false));
  EXPECT_TRUE(device.contactsStore.isSourceEnabled("local"));
  EXPECT_TRUE(disableAddressBookLocalStore(true));
  EXPECT_FALSE(device.contactsStore.isSourceEnabled("local"));
  device.contactsStore.failNext("saveAddressBook", Status::failure(1, "disk full"));
  EXPECT_FALSE(disableAddressBookLocalStore(true));
}

TEST_F(LocalCalendarStore, EventsAreSetAndAWritableCalendarIsMadeSureOf) {
  addOtherSourceAndStore();
  setCalendarLocalStoreEnabled(kCalendars, false, false);
  EXPECT_EQ(device.journal, (Journal{"openCalendarDatabase(20)", "allStores()", "localStore()",
                                     "setStoreAllowsEvents(local, false)",
                                     "ensureWritableCalendarForEntityType(events, local)",
                                     "saveCalendarDatabase()"}));
  EXPECT_FALSE(localStore().allowsEvents);
  EXPECT_TRUE(localStore().allowsReminders);
  EXPECT_EQ(localStore().writableCalendars,
            std::set<platform::CalendarEntityType>{platform::CalendarEntityType::events});
  EXPECT_FALSE(device.calendarStore.contents.hasDefaultCalendarForNewReminders);
}

TEST_F(LocalCalendarStore, RemindersAreSetAndTheirDefaultCalendarIsMadeSureOf) {
  addOtherSourceAndStore();
  setCalendarLocalStoreEnabled(kReminders, false, false);
  EXPECT_EQ(device.journal,
            (Journal{"openCalendarDatabase(20)", "allStores()", "localStore()",
                     "setStoreAllowsReminders(local, false)",
                     "ensureWritableCalendarForEntityType(reminders, local)",
                     "ensureDefaultCalendarForNewReminders()", "saveCalendarDatabase()"}));
  EXPECT_TRUE(localStore().allowsEvents);
  EXPECT_FALSE(localStore().allowsReminders);
  EXPECT_TRUE(device.calendarStore.contents.hasDefaultCalendarForNewReminders);
}

TEST_F(LocalCalendarStore, EntityTypesHaveThePlatformsValues) {
  EXPECT_EQ(static_cast<int>(platform::CalendarEntityType::events), 2);
  EXPECT_EQ(static_cast<int>(platform::CalendarEntityType::reminders), 3);
}

TEST_F(LocalCalendarStore, IsShownAgain) {
  setCalendarLocalStoreEnabled(kCalendars, false, true);
  setCalendarLocalStoreEnabled(kCalendars, true, true);
  EXPECT_TRUE(localStore().allowsEvents);
}

TEST_F(LocalCalendarStore, AnotherDataclassChangesNothingAndIsSavedAllTheSame) {
  setCalendarLocalStoreEnabled("com.vantor.Dataclass.Notes", false, true);
  EXPECT_EQ(device.journal, (Journal{"openCalendarDatabase(20)", "allStores()", "localStore()",
                                     "saveCalendarDatabase()"}));
}

TEST_F(LocalCalendarStore, IsLeftAloneWithoutForceWhenItIsTheOnlyOne) {
  setCalendarLocalStoreEnabled(kCalendars, false, false);
  EXPECT_EQ(device.journal, (Journal{"openCalendarDatabase(20)", "allStores()"}));
  setCalendarLocalStoreEnabled(kCalendars, false, true);
  EXPECT_FALSE(localStore().allowsEvents);
}

TEST_F(LocalCalendarStore, WithoutAListOfStoresOnlyForceSetsIt) {
  addOtherSourceAndStore();
  device.calendarStore.failEvery("allStores");
  setCalendarLocalStoreEnabled(kCalendars, false, false);
  EXPECT_TRUE(localStore().allowsEvents);
  setCalendarLocalStoreEnabled(kCalendars, false, true);
  EXPECT_FALSE(localStore().allowsEvents);
}

TEST_F(LocalCalendarStore, NothingIsDoneWithoutADatabase) {
  device.calendarStore.failNext("openCalendarDatabase");
  setCalendarLocalStoreEnabled(kCalendars, true, true);
  EXPECT_EQ(device.journal, (Journal{"openCalendarDatabase(20)"}));
}

TEST_F(LocalCalendarStore, NothingIsSavedWithoutALocalStore) {
  device.calendarStore.contents.stores = {{"a"}, {"b"}};
  setCalendarLocalStoreEnabled(kCalendars, true, true);
  EXPECT_EQ(device.journal, (Journal{"openCalendarDatabase(20)", "allStores()", "localStore()"}));
}

TEST_F(LocalCalendarStore, FailedSaveIsNotToldAndDisablingAnswersTrue) {
  device.calendarStore.failEvery("saveCalendarDatabase");
  EXPECT_TRUE(disableCalendarLocalStore(true));
  EXPECT_TRUE(disableRemindersLocalStore(true));
  EXPECT_EQ(device.logLines(), Lines{});
}

TEST_F(LocalCalendarStore, DisablingHidesEventsOrRemindersAndHeedsForce) {
  EXPECT_TRUE(disableCalendarLocalStore(false));
  EXPECT_TRUE(disableRemindersLocalStore(false));
  EXPECT_TRUE(localStore().allowsEvents);
  EXPECT_TRUE(localStore().allowsReminders);
  EXPECT_TRUE(disableCalendarLocalStore(true));
  EXPECT_FALSE(localStore().allowsEvents);
  EXPECT_TRUE(localStore().allowsReminders);
  EXPECT_TRUE(disableRemindersLocalStore(true));
  EXPECT_FALSE(localStore().allowsReminders);
}

}  // namespace
}  // namespace localdata
