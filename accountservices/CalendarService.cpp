// The calendar service: calendar accounts and subscribed calendars, and an ear for every account
// with calendars or reminders.

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "accountservices/ServiceClasses.h"

namespace accountservices {
namespace {

auto& accountClass = kept<ServiceAccountClass>("CalendarServiceAccount");
auto& accountCreator =
    kept<NamingAccountCreator>("CalendarServiceAccountCreator", accountClass,
                               std::vector<std::string_view>{accountsettings::kCalDAVAccountType});
auto& subscriptionCreator =
    kept<MakingAccountCreator>("SubscribedCalendarCreator", "SubscribedCalendarServiceAccount");
auto& syncAccountCreator = kept<ServiceSyncAccountCreator>(
    "CalendarServiceSyncAccountCreator", "CalendarService",
    std::vector<std::string_view>{accountsettings::kAccountDataclassCalendars,
                                  accountsettings::kAccountDataclassReminders});
auto& notifier = kept<ServiceNotifier>("CalendarServiceNotifier");

}  // namespace
}  // namespace accountservices
