// Showing and hiding the stores of contacts and calendars.
#include <gmock/gmock.h>

#include "deviceimage/DeviceImageServices.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using platform::CalendarEntityType;
using testing::IsEmpty;

class Visibility : public testing::Test {
 protected:
  bool isVisible(Dataclass dataclass, const std::optional<std::string>& account = std::nullopt) {
    return image.stores().findStore(dataclass, account).store->visible;
  }
  std::vector<Collection> localCollections(Dataclass dataclass) {
    RecordStores stores = image.stores();
    return stores.listCollections(dataclass, stores.findStore(dataclass, std::nullopt).store->row)
        .collections;
  }
  TemporaryImage image;
  DeviceImageServices services{image.image};
  platform::ContactsStore& contacts = services.services().contactsStore;
  platform::CalendarStore& calendars = services.services().calendarStore;
};

TEST_F(Visibility, OfContactsChangesWithTheSave) {
  ASSERT_TRUE(image.stores().ensureStore(Dataclass::contacts, std::nullopt).isSuccess());
  ASSERT_TRUE(image.stores().ensureStore(Dataclass::contacts, "carddav").isSuccess());
  const platform::AddressBookPtr book = contacts.openAddressBook();
  EXPECT_EQ(contacts.allSourcesIncludingDisabled(book)->size(), 2U);
  contacts.setSourceEnabled(contacts.localSource(book), false);
  EXPECT_TRUE(isVisible(Dataclass::contacts));
  EXPECT_EQ(contacts.saveAddressBook(book).code, 0);
  EXPECT_FALSE(isVisible(Dataclass::contacts));
  EXPECT_TRUE(isVisible(Dataclass::contacts, "carddav"));
  EXPECT_EQ(contacts.allSourcesIncludingDisabled(contacts.openAddressBook())->size(), 2U);
}

TEST_F(Visibility, OfAnImageWithoutDatabasesChangesNothing) {
  const platform::AddressBookPtr book = contacts.openAddressBook();
  ASSERT_NE(book, nullptr);
  EXPECT_THAT(*contacts.allSourcesIncludingDisabled(book), IsEmpty());
  EXPECT_EQ(contacts.localSource(book), nullptr);
  EXPECT_EQ(contacts.saveAddressBook(book).code, 0);
  const platform::CalendarDatabasePtr database = calendars.openCalendarDatabase(20);
  ASSERT_NE(database, nullptr);
  EXPECT_THAT(*calendars.allStores(database), IsEmpty());
  EXPECT_EQ(calendars.localStore(database), nullptr);
  calendars.ensureDefaultCalendarForNewReminders(database);
  EXPECT_EQ(calendars.saveCalendarDatabase(database).code, 0);
  EXPECT_THAT(image.stores().listStores().stores, IsEmpty());
}

TEST_F(Visibility, OfEventsAndRemindersChangesAlone) {
  ASSERT_TRUE(image.stores().ensureStore(Dataclass::calendars, std::nullopt).isSuccess());
  const platform::CalendarDatabasePtr database = calendars.openCalendarDatabase(20);
  const platform::CalendarStoreHandlePtr local = calendars.localStore(database);
  calendars.setStoreAllowsReminders(local, false);
  EXPECT_TRUE(isVisible(Dataclass::reminders));
  EXPECT_EQ(calendars.saveCalendarDatabase(database).code, 0);
  EXPECT_FALSE(isVisible(Dataclass::reminders));
  EXPECT_TRUE(isVisible(Dataclass::calendars));
}

TEST_F(Visibility, ComesWithOneWritableCalendarAndADefaultForReminders) {
  ASSERT_TRUE(image.stores().ensureStore(Dataclass::calendars, std::nullopt).isSuccess());
  for (int run = 0; run < 2; ++run) {
    const platform::CalendarDatabasePtr database = calendars.openCalendarDatabase(20);
    const platform::CalendarStoreHandlePtr local = calendars.localStore(database);
    calendars.ensureWritableCalendarForEntityType(database, CalendarEntityType::events, local);
    calendars.ensureWritableCalendarForEntityType(database, CalendarEntityType::reminders, local);
    calendars.ensureDefaultCalendarForNewReminders(database);
    EXPECT_EQ(calendars.saveCalendarDatabase(database).code, 0);
    ASSERT_EQ(localCollections(Dataclass::calendars).size(), 1U);
    ASSERT_EQ(localCollections(Dataclass::reminders).size(), 1U);
  }
  EXPECT_EQ(localCollections(Dataclass::calendars)[0].path, std::vector<std::string>{"Calendar"});
  EXPECT_EQ(localCollections(Dataclass::reminders)[0].path, std::vector<std::string>{"Reminders"});
  EXPECT_TRUE(localCollections(Dataclass::reminders)[0].isDefault);
}

TEST_F(Visibility, OfARetiredStoreIsNobodysBusiness) {
  RecordStores stores = image.stores();
  ASSERT_TRUE(stores.ensureStore(Dataclass::contacts, std::nullopt).isSuccess());
  const platform::AddressBookPtr book = contacts.openAddressBook();
  const Row local = stores.findStore(Dataclass::contacts, std::nullopt).store->row;
  ASSERT_TRUE(stores.retireStore(Dataclass::contacts, local).isSuccess());
  EXPECT_EQ(contacts.localSource(contacts.openAddressBook()), nullptr);
  contacts.setSourceEnabled(contacts.localSource(book), false);
  EXPECT_EQ(contacts.saveAddressBook(book).code, 0);
}

}  // namespace
}  // namespace deviceimage
