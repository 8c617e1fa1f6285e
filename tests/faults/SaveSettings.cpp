// Loads, changes and saves the settings of a device image, for tests that fail or kill it on the
// way.
//   fault_saver once IMAGE          changes the name of account "A" and saves
//   fault_saver twice IMAGE         the same, and saves again
//   fault_saver many IMAGE ID N     N times: loads, counts up in the account ID, saves
//   fault_saver add IMAGE ID N      N times, each under the migration lock: loads, adds an account,
//   saves fault_saver read IMAGE N        reads the settings file N times fault_saver until IMAGE
//   ID      as many, until it is killed
// The exit code says what happened, since a fault may hit any output: see Outcome. It is a sum.
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <iterator>
#include <limits>
#include <new>
#include <string>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "platform/InternalConsistencyFailure.h"
#include "platform/Services.h"

// Of the library that lets allocations fail, when it is there.
extern "C" void beginToFail() __attribute__((weak));

namespace {

using accountsettings::ASSAccountsManager;
using propertylist::Dictionary;

enum Outcome {
  kSaveFailed = 1,         // the first save logged its line
  kSavedLinesAreMany = 2,  // or more than one
  kSecondSaveFailed = 4,
  kDescriptorsLeaked = 8,
  kNotLoaded = 16,  // nothing was saved
  kWrongUsage = 32,
  kTorn = 64,          // a reader met no whole file
  kOutOfMemory = 128,  // the library threw; alone
};

int logLines = 0;

std::ptrdiff_t countOfDescriptors() {
  std::error_code error;
  return std::distance(std::filesystem::directory_iterator("/proc/self/fd", error), {});
}

int saveOnce(bool again) {
  // Both ways make the same calls up to the end of the first save, so that a fault hits the same
  // one.
  const std::ptrdiff_t before = countOfDescriptors();
  if (beginToFail != nullptr) beginToFail();
  const accountsettings::AccountsManagerPtr store = ASSAccountsManager::init();
  const accountsettings::AccountPtr account = store->accountWithIdentifier("A");
  if (account == nullptr) return kNotLoaded;
  account->setDisplayName("changed");
  logLines = 0;
  store->saveAllAccounts();
  int outcome = logLines == 0 ? 0 : kSaveFailed;
  if (logLines > 1) outcome += kSavedLinesAreMany;
  if (!again) return outcome;
  logLines = 0;
  store->saveAllAccounts();
  if (logLines > 0) outcome += kSecondSaveFailed;
  if (countOfDescriptors() != before) outcome += kDescriptorsLeaked;
  return outcome;
}

int saveMany(const std::string& identifier, long count) {
  for (long i = 0; i < count; ++i) {
    const accountsettings::AccountsManagerPtr store = ASSAccountsManager::init();
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
    const accountsettings::AccountsManagerPtr store = ASSAccountsManager::init();
    store->insertAccount(accountsettings::ASSBasicAccount::initWithProperties(
        Dictionary{{"Identifier", identifier + "-" + std::to_string(i)},
                   {"Type", "CalDAV"},
                   {"Class", "CalDAVAccount"}}));
    store->saveAllAccounts();
    ASSAccountsManager::releaseMigrationLock(lock);
  }
  return logLines == 0 ? 0 : kSaveFailed;
}

int readMany(long count) {
  const std::string path = ASSAccountsManager::fullPathToAccountSettingsPlist();
  for (long i = 0; i < count; ++i) {
    const propertylist::FileReadResult read =
        platform::services().fileServices.readPropertyListFile(path);
    if (!read.value || read.value->asDictionary() == nullptr) return kTorn;
  }
  return 0;
}

int run(int count, char** arguments) {
  if (count < 3) return kWrongUsage;
  const std::string work = arguments[1];
  const deviceimage::OpenedImage opened = deviceimage::DeviceImage::open(arguments[2]);
  if (opened.image == nullptr) return kNotLoaded;
  deviceimage::ServiceOptions options;
  options.writesLog = false;
  options.logSink = [](std::string_view) { ++logLines; };
  options.resourceDirectory = RESOURCES;
  const deviceimage::DeviceImageServices services(opened.image, options);
  platform::install(services.services());
  if (work == "once" || work == "twice") return saveOnce(work == "twice");
  if (work == "read" && count == 4) return readMany(std::atol(arguments[3]));
  if (work == "until" && count == 4)
    return saveMany(arguments[3], std::numeric_limits<long>::max());
  if (count < 5) return kWrongUsage;
  if (work == "many") return saveMany(arguments[3], std::atol(arguments[4]));
  if (work == "add") return addMany(arguments[3], std::atol(arguments[4]));
  return kWrongUsage;
}

}  // namespace

int main(int count, char** arguments) {
  try {
    return run(count, arguments);
  } catch (const platform::InternalConsistencyFailure&) {
    return kNotLoaded;  // a resource of the library could not be read
  } catch (const std::bad_alloc&) {
    return kOutOfMemory;
  }
}
