#pragma once

#include <functional>
#include <string>
#include <vector>

#include "migrator/MergeAndRemoveQuillnetAccounts.h"
#include "platform/testing/ForwardingSystemLog.h"
#include "tests/localdata/LocalDataTest.h"

namespace migrator {

using accountsettings::AccountPtr;
using platform::Status;
using propertylist::Array;
using propertylist::Dictionary;
using propertylist::Value;

// The migrator with its parts in reach.
class OpenedUpMigrator : public MergeAndRemoveQuillnetAccounts {
 public:
  using MergeAndRemoveQuillnetAccounts::_mergeAccountDataToLocalStore;
  using MergeAndRemoveQuillnetAccounts::_removeAccount;
  using MergeAndRemoveQuillnetAccounts::manager;
};

// Calls a test's listener before each line is written.
class ListenedToLog : public platform::ForwardingSystemLog {
 public:
  using ForwardingSystemLog::ForwardingSystemLog;
  std::function<void(std::string_view line)> listener;

  void writeLine(std::string_view text) override {
    if (listener) listener(text);
    ForwardingSystemLog::writeLine(text);
  }
};

// A device with accounts of the service. Its journal has the lines of the system log in between,
// as "log: ...".
class MigratorTest : public localdata::LocalDataTest {
 protected:
  MigratorTest() {
    log.listener = [this](std::string_view line) {
      device.journal.push_back("log: " + std::string(line));
    };
    device.use<platform::SystemLog>(log);
  }

  // An account that is to be retired.
  static Dictionary selectedInfo(std::string_view identifier,
                                 const std::vector<std::string>& enabled) {
    return with(accountInfo("Quillnet", identifier, enabled), {{"QuillnetStatus", 1}});
  }
  // The identifiers of the accounts in the settings file, in order.
  Lines savedIdentifiers() const {
    Lines identifiers;
    const Dictionary settings = device.readSettings();
    for (const Value& account : *propertylist::findArray(settings, "Accounts"))
      identifiers.push_back(*propertylist::findString(*account.asDictionary(), "Identifier"));
    return identifiers;
  }

  ListenedToLog log{device.systemLog};
  OpenedUpMigrator migrator;
};

}  // namespace migrator
