// The mail service: mail accounts of every kind, and accounts that carry other data beside mail,
// whose connection it holds; and an ear for every account with mail or notes.

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "accountservices/ServiceClasses.h"

namespace accountservices {
namespace {

ServiceAccountClass accountClass("MailServiceAccount");
NamingAccountCreator accountCreator("MailServiceAccountCreator", accountClass,
                                    {accountsettings::kMailAccountType,
                                     accountsettings::kBriskIMAPAccountType,
                                     accountsettings::kIMAPNotesAccountType,
                                     accountsettings::kSMTPAccountType});
MakingAccountCreator groupCreator("GroupAccountCreator", "GroupServiceAccount");
ServiceSyncAccountCreator syncAccountCreator("MailServiceSyncAccountCreator", "MailService",
                                             {accountsettings::kAccountDataclassMail,
                                              accountsettings::kAccountDataclassNotes});
// One connection refreshes everything that such an account carries.
ServiceSyncAccountCreator groupSyncCreator("GroupSyncAccountCreator", "MailService",
                                           {accountsettings::kAccountDataclassMail,
                                            accountsettings::kAccountDataclassContacts,
                                            accountsettings::kAccountDataclassCalendars,
                                            accountsettings::kAccountDataclassReminders,
                                            accountsettings::kAccountDataclassNotes});
ServiceNotifier notifier("MailServiceNotifier");

}  // namespace
}  // namespace accountservices
