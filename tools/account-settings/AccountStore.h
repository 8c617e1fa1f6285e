#pragma once

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "tools/common/Images.h"

namespace tools {

// One account of a store. A child is a record of its own, made from its dictionary among the
// parent's children.
struct FoundAccount {
  accountsettings::AccountPtr account;
  accountsettings::AccountPtr parent;  // null for a top-level account
  std::size_t index = 0;               // of a child, in the parent's "ChildAccounts"
};

// The accounts of an image as the account settings library sees them, with the image's services
// installed in this process. One at a time.
class AccountStore {
 public:
  // Ends the command when the settings file cannot be read, or the library's resources are not
  // installed. Writes nothing, to the image's log neither.
  explicit AccountStore(ImagePtr image);

  const deviceimage::DeviceImage& image() const { return *_image; }
  accountsettings::ASSAccountsManager& manager() { return *_manager; }
  // The settings file's root, as it was read; empty when there is no file.
  const propertylist::Dictionary& root() const { return _root; }
  // What the library logged so far.
  const std::vector<std::string>& logLines() const { return *_logLines; }
  // From here on the library's lines go to the image's log as well.
  void startLogging();

  // The stored identifiers of all accounts, children included; empty ones for those without.
  std::vector<std::string> identifiers() const;
  // The one account, child accounts included, with the identifier. Ends the command when there is
  // none, or more than one.
  FoundAccount find(std::string_view identifier) const;
  // The usable children of a top-level account, in the order of the file.
  static std::vector<FoundAccount> childrenOf(const accountsettings::AccountPtr& parent);
  // Takes the properties of a found account that was changed over into the store.
  void update(const FoundAccount& changed);
  // Every top-level account's properties, as a save would write them without a merge.
  std::vector<propertylist::Dictionary> snapshot() const;

 private:
  std::vector<FoundAccount> _all() const;

  ImagePtr _image;
  std::shared_ptr<std::vector<std::string>> _logLines;
  std::unique_ptr<deviceimage::DeviceImageServices> _services;
  propertylist::Dictionary _root;
  accountsettings::AccountsManagerPtr _manager;
};

// Installs the image's services, with the installed resources of the library. Lines of the log go
// to `lines` and, when `writesLog`, to the image's log.
std::unique_ptr<deviceimage::DeviceImageServices> installServices(
    const ImagePtr& image, const std::shared_ptr<std::vector<std::string>>& lines, bool writesLog);

// The identifier that is stored for the account; empty when the library has made one that no file
// holds yet.
std::string storedIdentifier(const accountsettings::ASSBasicAccount& account);

}  // namespace tools
