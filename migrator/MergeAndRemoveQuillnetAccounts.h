#pragma once

#include <string>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "platform/DataClassMigrator.h"

namespace migrator {

// Retires the accounts of the closed service: merges the data of each into the stores of the device
// and deletes the account. An account is retired when its type is "Quillnet" or "VantorAccount" and
// its service status is exactly 1. Each account is finished, saved settings included, before the
// next one is looked at, so that an interruption loses nothing: what is done stays done and the
// rest is untouched.
class MergeAndRemoveQuillnetAccounts : public platform::DataClassMigrator {
 public:
  std::string dataClassName() override;
  // True in every case: what fails is logged, and the accounts it concerns are dealt with as far as
  // they can be. A broken installation raises platform::InternalConsistencyFailure through to the
  // host.
  bool performMigration() override;

 protected:
  // Handles every dataclass that the account has enabled. Always true: a dataclass that could not
  // be merged does not keep its account, and the store it was to be merged from is removed all the
  // same. A service whose stores may hold what could not be merged keeps them aside for that
  // reason.
  virtual bool _mergeAccountDataToLocalStore(const accountsettings::AccountPtr& account);
  // Deletes the account and saves. Always true, also when the save failed; the caller does not
  // look.
  virtual bool _removeAccount(const accountsettings::AccountPtr& account);

  // The store of the current or last run; empty before the first.
  const accountsettings::AccountsManagerPtr& manager() const { return manager_; }

 private:
  accountsettings::AccountsManagerPtr manager_;
};

}  // namespace migrator
