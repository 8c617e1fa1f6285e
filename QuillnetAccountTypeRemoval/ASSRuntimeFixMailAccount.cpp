#include "QuillnetAccountTypeRemoval/ASSRuntimeFixMailAccount.h"

#include <array>

#include "platform/Services.h"

namespace accountsettings {
namespace {

// How the mail engine names the accounts of the two providers: mail domain, "@", IMAP host.
constexpr std::string_view kGmailAccountPathFragment = "gmail.com@imap.gmail.com";
constexpr std::string_view kYahooAccountPathFragment = "imap.mail.yahoo.com";

struct PathRule {
  std::string_view fragment;
  std::string_view className;
};

// The first rule whose fragment occurs anywhere in the path decides, not the first fragment in the
// path: the IMAP accounts of the providers lie under "Mail/IMAP-" too.
constexpr std::array<PathRule, 8> kPathRules = {{
    {"Mail/Dorn-", "PellixAccount"},
    {"Mail/Quillnet-", "QuillnetAccount"},
    {"Mail/AOL-", "AOLAccount"},
    {"Mail/Mailboxes", "LocalAccount"},
    {kGmailAccountPathFragment, "GmailAccount"},
    {kYahooAccountPathFragment, "YahooAccount"},
    {"Mail/POP-", "POPAccount"},
    {"Mail/IMAP-", "IMAPAccount"},
}};

}  // namespace

ASSRuntimeFixMailAccount::ASSRuntimeFixMailAccount()
    : supportedMailClasses_{"PellixAccount", "QuillnetAccount", "POPAccount",   "IMAPAccount",
                            "AOLAccount",    "LocalAccount",    "GmailAccount", "YahooAccount"} {}

std::shared_ptr<ASSRuntimeFixMailAccount> ASSRuntimeFixMailAccount::init() {
  return std::make_shared<ASSRuntimeFixMailAccount>();
}

const std::set<std::string, std::less<>>& ASSRuntimeFixMailAccount::supportedAccountTypes() const {
  static const std::set<std::string, std::less<>> types{std::string(kQuillnetAccountType),
                                                        std::string(kMailAccountType)};
  return types;
}

FixVerdict ASSRuntimeFixMailAccount::fixBasicAccountIfNeededLoggingMessage(
    const AccountPtr& account, [[maybe_unused]] std::string_view message) {
  if (!supportedAccountTypes().contains(account->type().value_or("")))
    return FixVerdict::nothingToDo;
  if (supportedMailClasses_.contains(account->accountClass().value_or("")))
    return FixVerdict::nothingToDo;
  shouldNotifyMobileMail_ = true;
  return _cleanupAccountClass(account) ? FixVerdict::fixed : FixVerdict::couldNotFix;
}

bool ASSRuntimeFixMailAccount::_cleanupAccountClass(const AccountPtr& account) {
  const propertylist::Value* path = account->accountPropertyForKey("AccountPath");
  if (path != nullptr && path->asString() != nullptr) {
    for (const PathRule& rule : kPathRules) {
      if (path->asString()->find(rule.fragment) == std::string::npos) continue;
      account->setAccountClass(std::string(rule.className));
      return true;
    }
  }
  platform::logToSystem("Could not fix the class of the mail account: %@", account->properties());
  return false;
}

void ASSRuntimeFixMailAccount::accountsHaveBeenSaved(bool saved) {
  if (shouldNotifyMobileMail_ && saved)
    platform::services().preferences.postPreferencesChanged("com.vantor.mobilemail",
                                                            "MailAccounts");
  shouldNotifyMobileMail_ = false;
}

const void* reportMailAccountClassFound(const void* value) { return value; }

}  // namespace accountsettings
