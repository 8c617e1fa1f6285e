#include "platform/testing/InMemoryContactsStore.h"

#include <algorithm>
#include <utility>

namespace platform {

struct InMemoryContactsStore::Book : AddressBook {
  explicit Book(std::vector<Source> stored) : sources(std::move(stored)) {}
  std::vector<Source> sources;
};

struct InMemoryContactsStore::BookSource : ContactsSource {
  BookSource(std::shared_ptr<Book> owner, std::size_t place)
      : book(std::move(owner)), index(place) {}
  Source& source() const { return book->sources[index]; }
  std::shared_ptr<Book> book;
  std::size_t index;
};

bool InMemoryContactsStore::isSourceEnabled(std::string_view name) const {
  return std::any_of(sources.begin(), sources.end(),
                     [&](const Source& source) { return source.name == name && source.enabled; });
}

AddressBookPtr InMemoryContactsStore::openAddressBook() {
  if (_fails("openAddressBook", {})) return nullptr;
  return std::make_shared<Book>(sources);
}

std::optional<std::vector<ContactsSourcePtr>> InMemoryContactsStore::allSourcesIncludingDisabled(
    const AddressBookPtr& book) {
  if (_fails("allSourcesIncludingDisabled", {})) return std::nullopt;
  const auto open = std::dynamic_pointer_cast<Book>(book);
  std::vector<ContactsSourcePtr> all;
  for (std::size_t i = 0; i < open->sources.size(); ++i)
    all.push_back(std::make_shared<BookSource>(open, i));
  return all;
}

ContactsSourcePtr InMemoryContactsStore::localSource(const AddressBookPtr& book) {
  if (_fails("localSource", {})) return nullptr;
  const auto open = std::dynamic_pointer_cast<Book>(book);
  for (std::size_t i = 0; i < open->sources.size(); ++i)
    if (open->sources[i].isLocal) return std::make_shared<BookSource>(open, i);
  return nullptr;
}

void InMemoryContactsStore::setSourceEnabled(const ContactsSourcePtr& source, bool enabled) {
  Source& changed = dynamic_cast<BookSource&>(*source).source();
  if (_fails("setSourceEnabled", {changed.name, enabled ? "true" : "false"})) return;
  changed.enabled = enabled;
}

Status InMemoryContactsStore::saveAddressBook(const AddressBookPtr& book) {
  return _answered("saveAddressBook", {}, [&] {
    sources = dynamic_cast<Book&>(*book).sources;
    return Status::success();
  });
}

}  // namespace platform
