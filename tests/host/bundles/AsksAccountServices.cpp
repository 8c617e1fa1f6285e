// Asks for the full account of every account, has its calendars refreshed and its notifiers told,
// all through the account settings library. Succeeds when every account could be asked.
#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "tests/host/bundles/TestMigrator.h"

bool migrate() {
  constexpr const char* kCalendars = "com.vantor.Dataclass.Calendars";
  using accountsettings::ASSAccountsManager;
  const auto store = ASSAccountsManager::init();
  for (const accountsettings::AccountPtr& account : *store->allBasicAccounts()) {
    const auto full = account->fullAccountUsingLoader(nullptr);
    platform::logToSystem("%@", dynamic_cast<const platform::Describable*>(full.get()));
    if (!account->refreshContainersForDataclass(kCalendars)) return false;
    ASSAccountsManager::accountDidChangeForDataclass(account, kCalendars);
  }
  return store->count() > 0;
}
