#pragma once

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/posix/ProcessClassRegistry.h"
#include "tests/QuillnetAccountTypeRemoval/AccountsDevice.h"

namespace accountsettings {

// Where the test's bundles lie below the device's root.
inline constexpr const char* kFullAccounts = "Library/Creators/FullAccounts.so";
inline constexpr const char* kSyncAccounts = "Library/Creators/SyncAccounts.so";
inline constexpr const char* kNotifiers = "Library/Creators/Notifiers.so";
inline constexpr const char* kUnresolved = "Library/Creators/Unresolved.so";

inline constexpr const char* kContacts = "com.vantor.Dataclass.Contacts";
inline constexpr const char* kMail = "com.vantor.Dataclass.Mail";
inline constexpr const char* kNotes = "com.vantor.Dataclass.Notes";

// A device with the test's bundles and the real registry of classes. What the bundles' classes are
// told is in diaryLines, which starts empty.
class CreatorsDevice : public AccountsDevice {
 public:
  CreatorsDevice();

  // Writes AccountCreators.plist; it counts only before its first use in the process.
  void setCreators(const Dictionary& creators) { setResource("AccountCreators", creators); }
  std::string bundlePath(const std::string& framework) const { return root() + "/" + framework; }

 private:
  platform::ProcessClassRegistry _registry;
};

Lines& diaryLines();
void letCreationFail(bool fails);

// Whether the bundle's classes are registered, which happens while it is loaded.
bool fullAccountsAreLoaded();
bool syncAccountsAreLoaded();
bool notifiersAreLoaded();

// Entries of the catalogue of creators.
Dictionary entry(const std::string& type, const Dictionary& description);
Dictionary creator(const std::string& type, const std::string& framework,
                   const std::string& className);
Dictionary notifier(const std::string& className, const Array& dataclasses);

// A line of the diary that says what a notifier was told of one account.
std::string told(const std::string& notifier, const Array& changes);
Dictionary change(int kind, const std::string& identifier, const std::string& type,
                  const Array& originalDataclasses);

class CreatingAccount : public OpenAccount {
 public:
  using ASSBasicAccount::_accountCreationMap;
  using ASSBasicAccount::_cachedSyncAccount;
  using ASSBasicAccount::_creatorClassNameForAccountTypeCreatorTypeLoader;
  using ASSBasicAccount::_creatorsInfo;
  using OpenAccount::OpenAccount;

  static std::shared_ptr<CreatingAccount> initWithProperties(const Dictionary& properties) {
    return _recordWithProperties<CreatingAccount>(properties);
  }
};
std::shared_ptr<CreatingAccount> calendarAccount(std::string_view identifier = "1");

class TellingStore : public OpenStore {
 public:
  using ASSAccountsManager::
      _addNotificationToDictionaryForChangeTypeOriginalPropertiesCurrentProperties;
  using ASSAccountsManager::_notifierClassNamesForAccountTypeDataclass;
  using ASSAccountsManager::NotificationTable;

  static std::shared_ptr<TellingStore> ofFile();
};

// A loader that notes the identifiers of the properties it is asked with.
class NotingLoader : public FullAccountLoader {
 public:
  explicit NotingLoader(bool answer) : _answer(answer) {}
  bool loadBundleForAccountWithProperties(const Dictionary& properties) override;
  Lines asked;

 private:
  bool _answer;
};

// Expects `operation` to end in an assertion failure of the store, at this line.
template <typename Operation>
void expectStoreFailure(const std::string& text, int line, Operation operation) {
  try {
    operation();
    ADD_FAILURE() << "nothing was raised";
  } catch (const platform::InternalConsistencyFailure& failure) {
    EXPECT_EQ(failure.what(), text);
    EXPECT_EQ(failure.sourceFile(), "ASSAccountsManager");
    EXPECT_EQ(failure.line(), line);
  }
}

}  // namespace accountsettings
