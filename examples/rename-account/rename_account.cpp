// Lists the accounts of a device image, or gives one of them another name and has the image's
// notifiers told. Notifiers and full accounts are code of the image, which runs in this process
// with its rights: rename accounts only of an image that nobody else can write.

#include <cstdlib>
#include <iostream>
#include <string>
#include <string_view>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "deviceimage/ImageLock.h"
#include "platform/InternalConsistencyFailure.h"

using accountsettings::AccountPtr;
using accountsettings::ASSAccountsManager;

namespace {

constexpr const char* kUsage =
    "usage: rename-account IMAGE RESOURCES [ID NAME]\n"
    "IMAGE is a device image, RESOURCES the folder with the library's catalogues.\n";

void list(const ASSAccountsManager& store) {
  for (const AccountPtr& account : *store.allBasicAccounts())
    std::cout << account->identifier().value_or("-") << "  " << account->type().value_or("-")
              << "  " << account->displayName().value_or("-") << '\n';
}

// False when there is no such account.
bool rename(ASSAccountsManager& store, const std::string& identifier, const char* name) {
  const AccountPtr account = store.accountWithIdentifier(identifier);
  // A child's identifier finds its parent.
  if (!account || account->identifier() != identifier) return false;
  account->setDisplayName(name);
  ASSAccountsManager::_setShouldSkipNotifications(false);
  store.saveAllAccounts();
  return true;
}

int fail(const std::string& reason) {
  std::cerr << "rename-account: " << reason << '\n';
  return EXIT_FAILURE;
}

}  // namespace

int main(int count, char** arguments) {
  if (count != 3 && count != 5) {
    std::cerr << kUsage;
    return 2;
  }
  const deviceimage::OpenedImage opened = deviceimage::DeviceImage::open(arguments[1]);
  if (!opened.image) return fail(opened.error);
  // One program at a time changes an image. A save makes its temporary file in TMPDIR.
  const auto attempt = deviceimage::ImageLock::tryAcquire(*opened.image);
  if (!attempt.lock) return fail(attempt.error);
  ::setenv("TMPDIR", opened.image->temporaryDirectory().c_str(), 1);

  // The library asks the installed services for everything outside the process. It logs what fails.
  deviceimage::ServiceOptions options;
  options.processName = "rename-account";
  options.resourceDirectory = arguments[2];
  bool isUnsaved = false;  // the log alone tells whether a save succeeded
  options.logSink = [&isUnsaved](std::string_view line) {
    std::cerr << line << '\n';
    if (line.starts_with("Failed to save accounts to filesystem.")) isUnsaved = true;
  };
  const deviceimage::DeviceImageServices services(opened.image, options);
  platform::install(services.services());
  try {
    const auto store = ASSAccountsManager::init();
    if (count == 5 && !rename(*store, arguments[3], arguments[4]))
      return fail(std::string("there is no account \"") + arguments[3] + "\"");
    if (isUnsaved) return fail("the account was not renamed");
    list(*store);
  } catch (const platform::InternalConsistencyFailure& failure) {
    return fail(std::string("the installation is broken: ") + failure.what());
  }
  return EXIT_SUCCESS;
}
