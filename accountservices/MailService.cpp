// The mail service: mail accounts of every kind, and accounts that carry other data beside mail,
// whose connection it holds; and an ear for every account with mail or notes.

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "accountservices/ServiceClasses.h"

namespace accountservices {
namespace {

auto& accountClass = kept<ServiceAccountClass>("MailServiceAccount");
auto& accountCreator = kept<NamingAccountCreator>(
    "MailServiceAccountCreator", accountClass,
    std::vector<std::string_view>{
        accountsettings::kMailAccountType, accountsettings::kBriskIMAPAccountType,
        accountsettings::kIMAPNotesAccountType, accountsettings::kSMTPAccountType});
auto& groupCreator = kept<MakingAccountCreator>("GroupAccountCreator", "GroupServiceAccount");
auto& syncAccountCreator = kept<ServiceSyncAccountCreator>(
    "MailServiceSyncAccountCreator", "MailService",
    std::vector<std::string_view>{accountsettings::kAccountDataclassMail,
                                  accountsettings::kAccountDataclassNotes});
// One connection refreshes everything that such an account carries.
auto& groupSyncCreator = kept<ServiceSyncAccountCreator>(
    "GroupSyncAccountCreator", "MailService",
    std::vector<std::string_view>{
        accountsettings::kAccountDataclassMail, accountsettings::kAccountDataclassContacts,
        accountsettings::kAccountDataclassCalendars, accountsettings::kAccountDataclassReminders,
        accountsettings::kAccountDataclassNotes});
auto& notifier = kept<ServiceNotifier>("MailServiceNotifier");

}  // namespace
}  // namespace accountservices
