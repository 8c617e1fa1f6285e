// Any bytes as a settings file: it is loaded, asked, described, saved and loaded again. What was
// loaded is what is saved, and a second save changes nothing any more. What is saved after a file
// that cannot be read is the same for all such files, so that it is looked at for one of 16; and
// for a share of the files that stand for thousands of values.
#include <memory>
#include <set>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "fuzz/Check.h"
#include "fuzz/SettingsInMemory.h"
#include "fuzz/Share.h"
#include "platform/testing/InMemoryDevice.h"
#include "propertylist/Writing.h"

namespace {

using namespace accountsettings;
using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

// The services in memory note their calls, so they are made anew from time to time.
class Device {
 public:
  fuzz::SettingsInMemory& withSettings(const std::uint8_t* data, std::size_t size) {
    if (_uses++ % 1000 == 0) {
      _device.reset();
      _device = std::make_unique<platform::InMemoryDevice>();
      _device->setResourcesDirectory(RESOURCES);
      _device->use<platform::FileServices>(_files);
    }
    _device->systemLog.clear();
    _files.settings.assign(data, data + size);
    _files.savesCount = 0;
    _files.setAsideCount = 0;
    return _files;
  }

 private:
  fuzz::SettingsInMemory _files;
  std::unique_ptr<platform::InMemoryDevice> _device;
  unsigned _uses = 0;
};

void ask(ASSAccountsManager& store) {
  for (const AccountPtr& account : store.allBasicSyncableAccounts()) {
    FUZZ_CHECK(account->type().has_value());
    FUZZ_CHECK(!account->description().empty());
    platform::formatLogLine("%@ %s %d", {account, account->properties()});
    account->displayName();
    account->typeString();
    account->parentAccountIdentifier();
    for (const std::string& dataclass :
         account->enabledDataclasses().value_or(account->provisionedDataclasses()))
      account->isEnabledForDataclass(dataclass);
    if (account->syncStoreIdentifier())
      FUZZ_CHECK(store.displayAccountWithSyncIdentifier(*account->syncStoreIdentifier()));
  }
  store.allMailAccounts();
}

// A value of the file, or an empty array.
Array accountsIn(const propertylist::Bytes& settings) {
  const propertylist::ReadResult read = propertylist::readPropertyList(settings);
  FUZZ_CHECK(read.value.has_value() && read.value->asDictionary() != nullptr);
  const Dictionary& root = *read.value->asDictionary();
  FUZZ_CHECK(*root.find("Version") == Value(12));
  FUZZ_CHECK(propertylist::findArray(root, "Accounts") != nullptr);
  return *propertylist::findArray(root, "Accounts");
}

// Accounts that share an identifier are merged with one another's entries of the file, so that what
// is saved is only known when each has its own.
void checkSaved(const ASSAccountsManager& store, const Array& saved) {
  const AccountArray& accounts = *store.allBasicAccounts();
  FUZZ_CHECK(saved.size() == accounts.size());
  std::set<std::string> identifiers;
  for (const AccountPtr& account : accounts) identifiers.insert(account->identifier().value_or(""));
  if (identifiers.size() < accounts.size()) return;
  for (std::size_t i = 0; i < accounts.size(); ++i)
    FUZZ_CHECK(saved[i] == Value(accounts[i]->propertiesToSave()));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static Device device;
  fuzz::SettingsInMemory& files = device.withSettings(data, size);
  const AccountsManagerPtr first = ASSAccountsManager::init();
  const std::optional<Value> read = propertylist::readPropertyList(files.settings).value;
  const bool isReadable = read.has_value();
  FUZZ_CHECK(isReadable || first->count() == 0);
  if (isReadable ? !fuzz::isChosen(*read, {data, size}) : !fuzz::isOneOf(16, {data, size}))
    return 0;
  ask(*first);
  first->saveAllAccounts();
  FUZZ_CHECK(files.savesCount == 1);
  FUZZ_CHECK(isReadable || files.setAsideCount == 1);
  checkSaved(*first, accountsIn(files.settings));

  const propertylist::Bytes saved = files.settings;
  const AccountsManagerPtr second = ASSAccountsManager::init();
  FUZZ_CHECK(second->count() == first->count());
  ask(*second);
  second->saveAllAccounts();
  FUZZ_CHECK(files.savesCount == 2);
  FUZZ_CHECK(files.settings == saved);
  return 0;
}
