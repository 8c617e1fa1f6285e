#pragma once

#include "platform/ContactsStore.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingContactsStore : public ContactsStore {
 public:
  explicit ForwardingContactsStore(ContactsStore& next) : _next(next) {}

  AddressBookPtr openAddressBook() override { return _next.openAddressBook(); }
  std::optional<std::vector<ContactsSourcePtr>> allSourcesIncludingDisabled(
      const AddressBookPtr& book) override {
    return _next.allSourcesIncludingDisabled(book);
  }
  ContactsSourcePtr localSource(const AddressBookPtr& book) override {
    return _next.localSource(book);
  }
  void setSourceEnabled(const ContactsSourcePtr& source, bool enabled) override {
    _next.setSourceEnabled(source, enabled);
  }
  Status saveAddressBook(const AddressBookPtr& book) override {
    return _next.saveAddressBook(book);
  }

 private:
  ContactsStore& _next;
};

}  // namespace platform
