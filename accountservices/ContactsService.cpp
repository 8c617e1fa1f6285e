// The contacts service: address books, directories and an ear for every account with contacts.

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "accountservices/ServiceClasses.h"

namespace accountservices {
namespace {

auto& accountClass = kept<ServiceAccountClass>("ContactsServiceAccount");
auto& accountCreator =
    kept<NamingAccountCreator>("ContactsServiceAccountCreator", accountClass,
                               std::vector<std::string_view>{accountsettings::kCardDAVAccountType});
auto& directoryCreator = kept<MakingAccountCreator>("DirectoryCreator", "DirectoryServiceAccount");
auto& syncAccountCreator = kept<ServiceSyncAccountCreator>(
    "ContactsServiceSyncAccountCreator", "ContactsService",
    std::vector<std::string_view>{accountsettings::kAccountDataclassContacts});
auto& notifier = kept<ServiceNotifier>("ContactsServiceNotifier");

}  // namespace
}  // namespace accountservices
