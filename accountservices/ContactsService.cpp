// The contacts service: address books, directories and an ear for every account with contacts.

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "accountservices/ServiceClasses.h"

namespace accountservices {
namespace {

ServiceAccountClass accountClass("ContactsServiceAccount");
NamingAccountCreator accountCreator("ContactsServiceAccountCreator", accountClass,
                                    {accountsettings::kCardDAVAccountType});
MakingAccountCreator directoryCreator("DirectoryCreator", "DirectoryServiceAccount");
ServiceSyncAccountCreator syncAccountCreator("ContactsServiceSyncAccountCreator", "ContactsService",
                                             {accountsettings::kAccountDataclassContacts});
ServiceNotifier notifier("ContactsServiceNotifier");

}  // namespace
}  // namespace accountservices
