// Loads, changes and saves the settings of a device image, for tests that fail or kill it on the
// way.
//   fault_saver once IMAGE           renames account "A" and the last one to "changed" and saves
//   fault_saver twice IMAGE          the same, and saves again; anew when the first try came to
//                                    nothing
//   fault_saver insert IMAGE         adds account "New" to what could be loaded, and saves
//   fault_saver insert-twice IMAGE   the same, and saves again
//   fault_saver change IMAGE         does what another program may do between two saves: renames
//                                    every account to "theirs" and notes its name before as "Seen"
//   fault_saver many IMAGE ID N      N times: loads, counts up in the account ID, saves
//   fault_saver until IMAGE ID       as many, until it is killed
//   fault_saver add IMAGE ID N       N times, each under the migration lock: loads, adds an
//   account,
//                                    saves
// The exit code says what happened, since a fault may hit any output: see Outcome. It is a sum.
//   SAVER_BEFORE_SAVE=C   the shell runs C after the first load
//   SAVER_BEFORE_SECOND=C the shell runs C before the second save
//   SAVER_LOG=F           what is logged is appended to the file F
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <limits>
#include <new>
#include <string>
#include <string_view>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "platform/InternalConsistencyFailure.h"
#include "platform/Services.h"

// Of the library that lets allocations fail, when it is there.
extern "C" void beginToFail() __attribute__((weak));
extern "C" void endOfFailing() __attribute__((weak));

namespace {

using accountsettings::AccountsManagerPtr;
using accountsettings::ASSAccountsManager;
using propertylist::Dictionary;

enum Outcome {
  kSaveFailed = 1,         // the first save logged its line
  kSavedLinesAreMany = 2,  // or more than one
  kSecondSaveFailed = 4,
  kDescriptorsLeaked = 8,
  kNotLoaded = 16,  // nothing was saved
  kWrongUsage = 32,
  kOutOfMemory = 64,  // the library threw; nothing is known of the first save
};

int logLines = 0;

void noteLogLine(std::string_view line) {
  ++logLines;
  if (const char* name = std::getenv("SAVER_LOG"))
    std::ofstream(name, std::fstream::app) << line << '\n';
}

std::ptrdiff_t countOfDescriptors() {
  std::error_code error;
  return std::distance(std::filesystem::directory_iterator("/proc/self/fd", error), {});
}

AccountsManagerPtr loadAndRename() {
  AccountsManagerPtr store = ASSAccountsManager::init();
  const accountsettings::AccountPtr account = store->accountWithIdentifier("A");
  if (account == nullptr) return nullptr;
  account->setDisplayName("changed");
  store->allBasicAccounts()->back()->setDisplayName("changed");
  return store;
}

AccountsManagerPtr loadAndInsert() {
  AccountsManagerPtr store = ASSAccountsManager::init();
  store->insertAccount(accountsettings::ASSBasicAccount::initWithProperties(
      Dictionary{{"Identifier", "New"}, {"Type", "CalDAV"}, {"Class", "CalDAVAccount"}}));
  return store;
}

// Loads and changes when there is no store yet, and saves, after the shell has run the command.
int tryToSave(AccountsManagerPtr& store, const std::function<AccountsManagerPtr()>& loadAndChange,
              const char* command) {
  try {
    if (store == nullptr) store = loadAndChange();
    if (store == nullptr) return kNotLoaded;
    if (command != nullptr && std::system(command) != 0) return kWrongUsage;
    logLines = 0;
    store->saveAllAccounts();
    return (logLines > 0 ? kSaveFailed : 0) + (logLines > 1 ? kSavedLinesAreMany : 0);
  } catch (const platform::InternalConsistencyFailure&) {
    return kNotLoaded;  // a resource of the library could not be read
  } catch (const std::bad_alloc&) {
    return kOutOfMemory;
  }
}

int save(const std::function<AccountsManagerPtr()>& loadAndChange, bool again) {
  // Both ways make the same calls up to the end of the first save, so that a fault hits the same
  // one.
  const std::ptrdiff_t before = countOfDescriptors();
  AccountsManagerPtr store;
  if (beginToFail != nullptr) beginToFail();
  int outcome = tryToSave(store, loadAndChange, std::getenv("SAVER_BEFORE_SAVE"));
  if (endOfFailing != nullptr) endOfFailing();
  if (!again) return outcome;
  if (tryToSave(store, loadAndChange, std::getenv("SAVER_BEFORE_SECOND")) != 0)
    outcome += kSecondSaveFailed;
  if (countOfDescriptors() != before) outcome += kDescriptorsLeaked;
  return outcome;
}

int change() {
  const AccountsManagerPtr store = ASSAccountsManager::init();
  for (const accountsettings::AccountPtr& account : *store->allBasicAccounts()) {
    account->setAccountPropertyForKey(propertylist::Value(account->displayName().value_or("")),
                                      "Seen");
    account->setDisplayName("theirs");
  }
  store->saveAllAccounts();
  return logLines == 0 ? 0 : kSaveFailed;
}

int saveMany(const std::string& identifier, long count) {
  for (long i = 0; i < count; ++i) {
    const AccountsManagerPtr store = ASSAccountsManager::init();
    const accountsettings::AccountPtr account = store->accountWithIdentifier(identifier);
    if (account == nullptr) return kNotLoaded;
    account->setAccountPropertyForKey(propertylist::Value(i), "Count");
    store->saveAllAccounts();
  }
  return logLines == 0 ? 0 : kSaveFailed;
}

int addMany(const std::string& identifier, long count) {
  for (long i = 0; i < count; ++i) {
    const platform::HeldFileLockPtr lock = ASSAccountsManager::createAndLockMigrationLock();
    const AccountsManagerPtr store = ASSAccountsManager::init();
    store->insertAccount(accountsettings::ASSBasicAccount::initWithProperties(
        Dictionary{{"Identifier", identifier + "-" + std::to_string(i)},
                   {"Type", "CalDAV"},
                   {"Class", "CalDAVAccount"}}));
    store->saveAllAccounts();
    ASSAccountsManager::releaseMigrationLock(lock);
  }
  return logLines == 0 ? 0 : kSaveFailed;
}

int run(int count, char** arguments) {
  if (count < 3) return kWrongUsage;
  const std::string work = arguments[1];
  const deviceimage::OpenedImage opened = deviceimage::DeviceImage::open(arguments[2]);
  if (opened.image == nullptr) return kNotLoaded;
  deviceimage::ServiceOptions options;
  options.writesLog = false;
  options.logSink = noteLogLine;
  options.resourceDirectory = RESOURCES;
  const deviceimage::DeviceImageServices services(opened.image, options);
  platform::install(services.services());
  if (work == "once" || work == "twice") return save(loadAndRename, work == "twice");
  if (work == "insert" || work == "insert-twice") return save(loadAndInsert, work != "insert");
  if (work == "change") return change();
  if (work == "until" && count == 4)
    return saveMany(arguments[3], std::numeric_limits<long>::max());
  if (count < 5) return kWrongUsage;
  if (work == "many") return saveMany(arguments[3], std::atol(arguments[4]));
  if (work == "add") return addMany(arguments[3], std::atol(arguments[4]));
  return kWrongUsage;
}

}  // namespace

int main(int count, char** arguments) { return run(count, arguments); }
