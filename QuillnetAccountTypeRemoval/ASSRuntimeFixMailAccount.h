#pragma once

#include <memory>
#include <set>
#include <string>
#include <string_view>

#include "QuillnetAccountTypeRemoval/ASSBasicAccount.h"

namespace accountsettings {

// What a fixer did with an account; the values are fixed.
enum class FixVerdict {
  nothingToDo = 0,
  fixed = 1,
  couldNotFix = 2,  // the account is to be dropped
};

// Gives mail accounts whose class the mail engine no longer knows the class that their storage path
// implies, and tells the mail application, once the accounts are saved, that its accounts changed.
// Each store has a fixer of its own.
class ASSRuntimeFixMailAccount {
 public:
  ASSRuntimeFixMailAccount();
  virtual ~ASSRuntimeFixMailAccount() = default;
  ASSRuntimeFixMailAccount(const ASSRuntimeFixMailAccount&) = delete;
  ASSRuntimeFixMailAccount& operator=(const ASSRuntimeFixMailAccount&) = delete;

  static std::shared_ptr<ASSRuntimeFixMailAccount> init();

  // The types that are looked at; Gmail and Yahoo accounts are none of them.
  const std::set<std::string, std::less<>>& supportedAccountTypes() const;
  // Rewrites the class of an account of these types unless it is a known one. `message` says at
  // what occasion and is for diagnostics; nothing is written from it.
  virtual FixVerdict fixBasicAccountIfNeededLoggingMessage(const AccountPtr& account,
                                                           std::string_view message);
  // Tells the mail application when an account needed fixing since the last call and `saved` is
  // true. Forgets about these accounts in any case.
  virtual void accountsHaveBeenSaved(bool saved);

 protected:
  // False, with a log line, when the storage path implies no class.
  bool _cleanupAccountClass(const AccountPtr& account);
  bool shouldNotifyMobileMail() const { return shouldNotifyMobileMail_; }
  const std::set<std::string, std::less<>>& supportedMailClasses() const {
    return supportedMailClasses_;
  }

 private:
  const std::set<std::string, std::less<>> supportedMailClasses_;
  bool shouldNotifyMobileMail_ = false;
};

using RuntimeFixerPtr = std::shared_ptr<ASSRuntimeFixMailAccount>;

// Answers `value`. A point at which tracing can attach to see mail account classes; nothing calls
// it.
const void* reportMailAccountClassFound(const void* value);

}  // namespace accountsettings
