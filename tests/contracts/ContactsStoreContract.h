#pragma once

#include "platform/ContactsStore.h"
#include "tests/contracts/Port.h"

// One device with a contacts database that holds the local source, shown, and nothing else.
class ContactsStoreUnderTest {
 public:
  virtual ~ContactsStoreUnderTest() = default;
  virtual platform::ContactsStore& service() = 0;
  // Adds the source of an account.
  virtual void addAccountSource() = 0;
  // Whether the database shows the local source, past the service.
  virtual bool isLocalSourceEnabled() = 0;
};
using ContactsStorePort = Port<ContactsStoreUnderTest>;

class ContactsStoreContract : public Contract<ContactsStoreUnderTest> {
 protected:
  platform::ContactsStore& service() { return device->service(); }
  std::size_t sourceCount() {
    return service().allSourcesIncludingDisabled(service().openAddressBook()).value().size();
  }
};

TEST_P(ContactsStoreContract, ListsTheLocalSourceAndThoseOfAccounts) {
  EXPECT_EQ(sourceCount(), 1U);
  device->addAccountSource();
  EXPECT_EQ(sourceCount(), 2U);
}

TEST_P(ContactsStoreContract, ListsADisabledSourceToo) {
  const auto book = service().openAddressBook();
  service().setSourceEnabled(service().localSource(book), false);
  EXPECT_TRUE(service().saveAddressBook(book).isSuccess());
  EXPECT_EQ(sourceCount(), 1U);
  EXPECT_NE(service().localSource(service().openAddressBook()), nullptr);
}

TEST_P(ContactsStoreContract, ShowsOrHidesASourceFromTheNextSaveOn) {
  for (const bool enabled : {false, false, true, true}) {
    const bool before = device->isLocalSourceEnabled();
    const auto book = service().openAddressBook();
    service().setSourceEnabled(service().localSource(book), enabled);
    EXPECT_EQ(device->isLocalSourceEnabled(), before);
    EXPECT_TRUE(service().saveAddressBook(book).isSuccess());
    EXPECT_EQ(device->isLocalSourceEnabled(), enabled);
  }
}

TEST_P(ContactsStoreContract, DropsWhatIsNotSaved) {
  service().setSourceEnabled(service().localSource(service().openAddressBook()), false);
  EXPECT_TRUE(device->isLocalSourceEnabled());
}

TEST_P(ContactsStoreContract, ChangesTheSourceThatItIsGivenAlone) {
  device->addAccountSource();
  const auto book = service().openAddressBook();
  const auto sources = service().allSourcesIncludingDisabled(book);
  for (const auto& source : sources.value()) service().setSourceEnabled(source, false);
  service().setSourceEnabled(service().localSource(book), true);
  EXPECT_TRUE(service().saveAddressBook(book).isSuccess());
  EXPECT_TRUE(device->isLocalSourceEnabled());
}
