#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "deviceimage/DeviceImageServices.h"
#include "platform/InternalConsistencyFailure.h"
#include "platform/testing/TemporaryDirectory.h"

namespace accountservices {

using accountsettings::AccountPtr;
using accountsettings::ASSAccountsManager;
using propertylist::Array;
using propertylist::Dictionary;
using Lines = std::vector<std::string>;

inline constexpr const char* kCalendars = "com.vantor.Dataclass.Calendars";
inline constexpr const char* kContacts = "com.vantor.Dataclass.Contacts";
inline constexpr const char* kMail = "com.vantor.Dataclass.Mail";
inline constexpr const char* kNotes = "com.vantor.Dataclass.Notes";

// A device image with the built account services, the shipped resources and the real platform
// services, which are installed; the account settings library in this program works on it.
class ServicesImage {
 public:
  ServicesImage();
  ~ServicesImage();
  ServicesImage(const ServicesImage&) = delete;
  ServicesImage& operator=(const ServicesImage&) = delete;

  // Puts a further bundle among the services.
  void addBundle(const std::string& name, const std::string& builtFile) const;
  void removeBundle(const std::string& name) const;
  std::string bundlePath(const std::string& name) const;
  // Puts an entry behind those of the type. The catalogue counts as it is at its first use.
  void addEntry(const std::string& type, const Dictionary& entry) const;
  void addNotifier(const std::string& bundle, const std::string& className) const;

  void writeAccounts(const Array& accounts) const;
  // What another program finds in the settings file.
  Array savedAccounts() const;
  // Settings and temporary files that are not the settings file.
  Lines leftovers() const;
  // The lines of the journal without their time, which each must begin with.
  Lines journal(std::string_view name) const;
  Lines changes() const { return journal("var/log/account-changes.jsonl"); }
  Lines refreshes() const { return journal("var/log/refreshes.jsonl"); }

  const std::string& root() const { return _image->rootPath(); }
  const platform::Services& services() const { return _services->services(); }

 private:
  platform::TemporaryDirectory _directory;
  std::shared_ptr<const deviceimage::DeviceImage> _image;
  std::unique_ptr<deviceimage::DeviceImageServices> _services;
  std::optional<std::string> _earlierTemporaryDirectory;
};

// An account with one enabled dataclass, or none.
Dictionary account(const std::string& identifier, const std::string& type,
                   const std::string& dataclass = {}, const Dictionary& more = {});

// Expects `operation` to end in an assertion failure with this text.
template <typename Operation>
void expectFailure(const std::string& text, Operation operation) {
  try {
    operation();
    ADD_FAILURE() << "nothing was raised";
  } catch (const platform::InternalConsistencyFailure& failure) {
    EXPECT_EQ(failure.what(), text);
  }
}

// A test with an image, and a store of its accounts once they are written.
class ServicesTest : public testing::Test {
 protected:
  std::shared_ptr<ASSAccountsManager> storeOf(const Array& accounts) const {
    image.writeAccounts(accounts);
    return ASSAccountsManager::init();
  }
  static void rename(const ASSAccountsManager& store, std::string_view identifier) {
    store.accountWithIdentifier(identifier)->setDisplayName("new");
  }
  static void speak() { ASSAccountsManager::_setShouldSkipNotifications(false); }

  ServicesImage image;
};

}  // namespace accountservices
