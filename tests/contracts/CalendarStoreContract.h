#pragma once

#include "platform/CalendarStore.h"
#include "tests/contracts/Port.h"

// One device with a calendar database that holds the local store, which allows events and
// reminders, without a calendar, and nothing else.
class CalendarStoreUnderTest {
 public:
  struct LocalStore {
    bool allowsEvents = true;
    bool allowsReminders = true;
    int writableEventCalendars = 0;
    int writableReminderCalendars = 0;
    bool newRemindersHaveADefaultCalendar = false;
    friend bool operator==(const LocalStore&, const LocalStore&) = default;
    friend std::ostream& operator<<(std::ostream& out, const LocalStore& store) {
      return out << "events " << store.allowsEvents << " reminders " << store.allowsReminders
                 << " writable " << store.writableEventCalendars << "/"
                 << store.writableReminderCalendars << " default "
                 << store.newRemindersHaveADefaultCalendar;
    }
  };
  virtual ~CalendarStoreUnderTest() = default;
  virtual platform::CalendarStore& service() = 0;
  // Adds the store of an account.
  virtual void addAccountStore() = 0;
  // The local store as the database has it, past the service.
  virtual LocalStore localStore() = 0;
};
using CalendarStorePort = Port<CalendarStoreUnderTest>;

class CalendarStoreContract : public Contract<CalendarStoreUnderTest> {
 protected:
  using LocalStore = CalendarStoreUnderTest::LocalStore;
  static constexpr int kOptions = 20;  // what the system passes

  platform::CalendarStore& service() { return device->service(); }
  platform::CalendarDatabasePtr open() { return service().openCalendarDatabase(kOptions); }
};

TEST_P(CalendarStoreContract, ListsTheLocalStoreAndThoseOfAccounts) {
  EXPECT_EQ(service().allStores(open()).value().size(), 1U);
  device->addAccountStore();
  EXPECT_EQ(service().allStores(open()).value().size(), 2U);
  EXPECT_NE(service().localStore(open()), nullptr);
}

TEST_P(CalendarStoreContract, ShowsOrHidesEachKindAloneFromTheNextSaveOn) {
  const auto database = open();
  service().setStoreAllowsEvents(service().localStore(database), false);
  EXPECT_EQ(device->localStore(), (LocalStore{true, true}));
  EXPECT_TRUE(service().saveCalendarDatabase(database).isSuccess());
  EXPECT_EQ(device->localStore(), (LocalStore{false, true}));
  service().setStoreAllowsReminders(service().localStore(database), false);
  service().setStoreAllowsEvents(service().localStore(database), true);
  EXPECT_TRUE(service().saveCalendarDatabase(database).isSuccess());
  EXPECT_EQ(device->localStore(), (LocalStore{true, false}));
}

TEST_P(CalendarStoreContract, ListsAHiddenStoreToo) {
  const auto database = open();
  service().setStoreAllowsEvents(service().localStore(database), false);
  service().setStoreAllowsReminders(service().localStore(database), false);
  EXPECT_TRUE(service().saveCalendarDatabase(database).isSuccess());
  EXPECT_EQ(service().allStores(open()).value().size(), 1U);
  EXPECT_NE(service().localStore(open()), nullptr);
}

TEST_P(CalendarStoreContract, MakesOneWritableCalendarOfAKindAndNoSecond) {
  for (int times = 0; times < 2; ++times) {
    const auto database = open();
    const auto local = service().localStore(database);
    service().ensureWritableCalendarForEntityType(database, platform::CalendarEntityType::events,
                                                  local);
    service().ensureWritableCalendarForEntityType(database, platform::CalendarEntityType::events,
                                                  local);
    EXPECT_TRUE(service().saveCalendarDatabase(database).isSuccess());
    EXPECT_EQ(device->localStore().writableEventCalendars, 1);
    EXPECT_EQ(device->localStore().writableReminderCalendars, 0);
  }
  const auto database = open();
  service().ensureWritableCalendarForEntityType(database, platform::CalendarEntityType::reminders,
                                                service().localStore(database));
  EXPECT_TRUE(service().saveCalendarDatabase(database).isSuccess());
  EXPECT_EQ(device->localStore(), (LocalStore{true, true, 1, 1, false}));
}

TEST_P(CalendarStoreContract, GivesNewRemindersACalendarToGoTo) {
  const auto database = open();
  service().ensureWritableCalendarForEntityType(database, platform::CalendarEntityType::reminders,
                                                service().localStore(database));
  service().ensureDefaultCalendarForNewReminders(database);
  EXPECT_TRUE(service().saveCalendarDatabase(database).isSuccess());
  EXPECT_EQ(device->localStore(), (LocalStore{true, true, 0, 1, true}));
}

TEST_P(CalendarStoreContract, DropsWhatIsNotSaved) {
  {
    const auto database = open();
    const auto local = service().localStore(database);
    service().setStoreAllowsEvents(local, false);
    service().ensureWritableCalendarForEntityType(database, platform::CalendarEntityType::events,
                                                  local);
  }
  EXPECT_EQ(device->localStore(), LocalStore{});
}
