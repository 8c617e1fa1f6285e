#pragma once

#include <memory>
#include <optional>
#include <vector>

#include "platform/Export.h"
#include "platform/Status.h"

namespace platform {

// The open contacts database, and one of its sources. The platform's own objects.
class PLATFORM_EXPORT AddressBook {
 public:
  virtual ~AddressBook();
};
using AddressBookPtr = std::shared_ptr<AddressBook>;
class PLATFORM_EXPORT ContactsSource {
 public:
  virtual ~ContactsSource();
};
using ContactsSourcePtr = std::shared_ptr<ContactsSource>;

// The contacts database with its sources: the local one and one per account. A source may be
// disabled, which hides it from the user and keeps its contacts. Arguments are objects of this
// service, never empty. One thread at a time.
class PLATFORM_EXPORT ContactsStore {
 public:
  virtual ~ContactsStore();
  // Opens the database; empty when it cannot be opened.
  virtual AddressBookPtr openAddressBook() = 0;
  // All sources, disabled ones too; empty when the list cannot be had.
  virtual std::optional<std::vector<ContactsSourcePtr>> allSourcesIncludingDisabled(
      const AddressBookPtr& book) = 0;
  // The source of the contacts that no service syncs; empty when there is none.
  virtual ContactsSourcePtr localSource(const AddressBookPtr& book) = 0;
  // Shows or hides the source, lasting from the next saveAddressBook.
  virtual void setSourceEnabled(const ContactsSourcePtr& source, bool enabled) = 0;
  // Writes the changes. A failure may come without an error object.
  virtual Status saveAddressBook(const AddressBookPtr& book) = 0;
};

}  // namespace platform
