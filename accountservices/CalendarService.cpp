// The calendar service: calendar accounts and subscribed calendars, and an ear for every account
// with calendars or reminders.

#include "QuillnetAccountTypeRemoval/AccountConstants.h"
#include "accountservices/ServiceClasses.h"

namespace accountservices {
namespace {

ServiceAccountClass accountClass("CalendarServiceAccount");
NamingAccountCreator accountCreator("CalendarServiceAccountCreator", accountClass,
                                    {accountsettings::kCalDAVAccountType});
MakingAccountCreator subscriptionCreator("SubscribedCalendarCreator",
                                         "SubscribedCalendarServiceAccount");
ServiceSyncAccountCreator syncAccountCreator("CalendarServiceSyncAccountCreator", "CalendarService",
                                             {accountsettings::kAccountDataclassCalendars,
                                              accountsettings::kAccountDataclassReminders});
ServiceNotifier notifier("CalendarServiceNotifier");

}  // namespace
}  // namespace accountservices
