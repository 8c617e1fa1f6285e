#pragma once

#include <string>

#include "platform/ContactsStore.h"
#include "platform/testing/FakeService.h"

namespace platform {

// A contacts database whose sources a test lists. An open address book has changes of its own,
// which saveAddressBook writes back to `sources`; what is not saved is dropped with the book.
class InMemoryContactsStore : public ContactsStore, public FakeService {
 public:
  struct Source {
    std::string name;
    bool enabled = true;
    bool isLocal = false;
  };
  std::vector<Source> sources = {{"local", true, true}};

  // Whether the saved source is shown; false when there is none of that name.
  bool isSourceEnabled(std::string_view name) const;

  AddressBookPtr openAddressBook() override;
  std::optional<std::vector<ContactsSourcePtr>> allSourcesIncludingDisabled(
      const AddressBookPtr& book) override;
  ContactsSourcePtr localSource(const AddressBookPtr& book) override;
  void setSourceEnabled(const ContactsSourcePtr& source, bool enabled) override;
  Status saveAddressBook(const AddressBookPtr& book) override;

 private:
  struct Book;
  struct BookSource;
};

}  // namespace platform
