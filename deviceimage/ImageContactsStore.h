#pragma once

#include "deviceimage/Database.h"
#include "platform/ContactsStore.h"

namespace deviceimage {

// The contacts database: its sources are the active stores. An address book knows the stores that
// there were when it was opened; without a database it has none. Changes wait for saveAddressBook.
class ImageContactsStore : public platform::ContactsStore {
 public:
  // `databases` is shared with the other services of the image and outlives this.
  explicit ImageContactsStore(DatabaseSet& databases) : _databases(databases) {}

  platform::AddressBookPtr openAddressBook() override;
  std::optional<std::vector<platform::ContactsSourcePtr>> allSourcesIncludingDisabled(
      const platform::AddressBookPtr& book) override;
  platform::ContactsSourcePtr localSource(const platform::AddressBookPtr& book) override;
  void setSourceEnabled(const platform::ContactsSourcePtr& source, bool enabled) override;
  platform::Status saveAddressBook(const platform::AddressBookPtr& book) override;

 private:
  DatabaseSet& _databases;
};

}  // namespace deviceimage
