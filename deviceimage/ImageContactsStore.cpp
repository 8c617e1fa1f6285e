#include "deviceimage/ImageContactsStore.h"

#include "deviceimage/Dataclass.h"
#include "deviceimage/StoreRows.h"

namespace deviceimage {
namespace {

struct Source : platform::ContactsSource {
  Row store = 0;
  std::optional<bool> enabled;  // when it was set and not saved
};

struct Book : platform::AddressBook {
  std::vector<std::shared_ptr<Source>> sources;
  std::shared_ptr<Source> local;
};

}  // namespace

platform::AddressBookPtr ImageContactsStore::openAddressBook() {
  auto book = std::make_shared<Book>();
  const platform::Status opened = statusOf([&] {
    Database* const database = _databases.find(platform::ContactsSyncType);
    if (database == nullptr) return platform::Status::success();
    for (const ActiveStore& store : activeStores(*database)) {
      book->sources.push_back(std::make_shared<Source>());
      book->sources.back()->store = store.row;
      if (store.isLocal) book->local = book->sources.back();
    }
    return platform::Status::success();
  });
  return opened.isSuccess() ? book : nullptr;
}

std::optional<std::vector<platform::ContactsSourcePtr>>
ImageContactsStore::allSourcesIncludingDisabled(const platform::AddressBookPtr& book) {
  const auto opened = std::dynamic_pointer_cast<Book>(book);
  if (opened == nullptr) return std::nullopt;
  return std::vector<platform::ContactsSourcePtr>(opened->sources.begin(), opened->sources.end());
}

platform::ContactsSourcePtr ImageContactsStore::localSource(const platform::AddressBookPtr& book) {
  const auto opened = std::dynamic_pointer_cast<Book>(book);
  return opened == nullptr ? nullptr : opened->local;
}

void ImageContactsStore::setSourceEnabled(const platform::ContactsSourcePtr& source, bool enabled) {
  if (const auto ours = std::dynamic_pointer_cast<Source>(source)) ours->enabled = enabled;
}

platform::Status ImageContactsStore::saveAddressBook(const platform::AddressBookPtr& book) {
  return statusOf([&] {
    const auto opened = std::dynamic_pointer_cast<Book>(book);
    Database* const database = _databases.find(platform::ContactsSyncType);
    if (opened == nullptr || database == nullptr) return platform::Status::success();
    Transaction transaction(*database);
    for (const std::shared_ptr<Source>& source : opened->sources)
      if (source->enabled)
        setStoreVisible(*database, source->store, Dataclass::contacts, *source->enabled);
    transaction.commit();
    for (const std::shared_ptr<Source>& source : opened->sources) source->enabled.reset();
    return platform::Status::success();
  });
}

}  // namespace deviceimage
