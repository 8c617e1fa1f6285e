#pragma once

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "platform/InternalConsistencyFailure.h"
#include "platform/testing/InMemoryDevice.h"
#include "propertylist/Value.h"
#include "propertylist/Writing.h"

namespace propertylist {

// How a failed expectation shows values.
inline void PrintTo(const Value& value, std::ostream* out) { *out << describe(value); }
inline void PrintTo(const Array& array, std::ostream* out) { *out << describe(array); }
inline void PrintTo(const Dictionary& dictionary, std::ostream* out) {
  *out << describe(dictionary);
}

}  // namespace propertylist

namespace accountsettings {

using platform::CallJournal;
using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;
using Lines = std::vector<std::string>;

// The device of a test: in-memory services, a settings file in a directory of its own, and small
// catalogues in place of the shipped ones:
//
//   every type    no actions and no list unless named here
//   Quillnet      all fourteen dataclasses, Contacts first
//   CalDAV        Reminders, Calendars (in this order)
//   Mail          Mail, Notes; all four actions on both switches
//   OnMyDevice    Contacts, Calendars, Reminders, Bookmarks, Notes
//   Contacts, Calendars, Reminders, Notes keep several stores, the other dataclasses one
class AccountsDevice : public platform::InMemoryDevice {
 public:
  AccountsDevice();

  // Writes, or removes, a resource file that lies beside the code. The catalogues are read once per
  // process, at their first use.
  void setResource(const std::string& name, const Value& content);
  void setResourceBytes(const std::string& name, std::string_view bytes);
  void removeResource(const std::string& name);
  std::string resourcePath(const std::string& name) const;

  // Writes a settings file of version 12 with these accounts.
  void writeAccounts(const Array& accounts);
  // The accounts that the settings file holds now.
  Array savedAccounts() const;
  // Switches verbose tracing on; only before the first line of it.
  void traceVerbosely() { preferences.defaults.set("ASLoggingEnabled", true); }
  // How many calls the file services got that begin with `call`.
  std::size_t countOfFileCalls(std::string_view call) const;
};

// An account dictionary: the class is "C", and `more` is added.
Dictionary accountInfo(std::string_view identifier, std::string_view type = "CalDAV",
                       const Dictionary& more = {});
// A copy of `dictionary` with the value under the key, or without the key.
Dictionary with(Dictionary dictionary, std::string_view key, const Value& value);
Dictionary without(Dictionary dictionary, std::string_view key);

// The identifiers of accounts, in order; "(null)" for an account without one.
Lines identifiersOf(const AccountArray& accounts);
Lines identifiersOf(const Array& accountInfos);

// Runs `task` on a second thread, from the moment in which the resource is first asked for. The
// asking thread goes on when the second one has begun, and has had every chance to ask too.
class SecondComer {
 public:
  SecondComer(AccountsDevice& device, const std::string& resource, std::function<void()> task);
  void join() { _thread.join(); }

 private:
  std::atomic<int> _questions = 0;
  std::atomic<bool> _begun = false;
  std::thread _thread;
};

// Expects `operation` to end in an assertion failure of this text and source file.
template <typename Operation>
void expectAssertionFailure(const std::string& text, const std::string& sourceFile,
                            Operation operation) {
  try {
    operation();
    ADD_FAILURE() << "nothing was raised";
  } catch (const platform::InternalConsistencyFailure& failure) {
    EXPECT_EQ(failure.what(), text);
    EXPECT_EQ(failure.sourceFile(), sourceFile);
    EXPECT_GT(failure.line(), 0);
  }
}

// Records that let a test reach what only subclasses see.
class OpenAccount : public ASSBasicAccount {
 public:
  using ASSBasicAccount::_dataclassesProperties;
  using ASSBasicAccount::_forcedSetAccountPropertyForKey;
  using ASSBasicAccount::_forcedSetEnabledForDataclass;
  using ASSBasicAccount::_isValidAccountType;
  using ASSBasicAccount::_orderedDataclasses;
  using ASSBasicAccount::_profileRestrictedDataclasses;
  using ASSBasicAccount::ASSBasicAccount;

  static std::shared_ptr<OpenAccount> initWithProperties(const Dictionary& properties) {
    return _recordWithProperties<OpenAccount>(properties);
  }
};

// A store that lets a test reach its index of children, its snapshot and its construction.
class OpenStore : public ASSAccountsManager {
 public:
  using ASSAccountsManager::_createRuntimeFixers;
  using ASSAccountsManager::_loadChildrenFromAccount;
  using ASSAccountsManager::_removeChildrenForAccountWithIdentifier;
  using ASSAccountsManager::_setOriginalAccountDictionaries;
  using ASSAccountsManager::childAccountIDToParentAccountID;
  using ASSAccountsManager::childAccountsByID;
  using ASSAccountsManager::originalAccountsByID;

  static std::shared_ptr<OpenStore> ofFile();
  static std::shared_ptr<OpenStore> ofAccounts(const Array& accounts);

  // The identifiers of the registered children, sorted, each as "child of parent".
  Lines children() const;
};

}  // namespace accountsettings
