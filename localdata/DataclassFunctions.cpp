#include "localdata/DataclassFunctions.h"

#include <algorithm>
#include <array>

#include "QuillnetAccountTypeRemoval/ASSAccountsManager.h"
#include "platform/Services.h"

namespace localdata {

using namespace accountsettings;
using platform::DataSourceOptions;
using platform::SyncDataType;

namespace {

constexpr std::array kNeverLocal = {kAccountDataclassMail,          kAccountDataclassUbiquity,
                                    kAccountDataclassKeyValue,      kAccountDataclassShoebox,
                                    kAccountDataclassSharedStreams, kAccountDataclassMediaStream};

// The text of an error, or "Unknown" for a failure that came without one.
std::string errorOrUnknown(const platform::Status& status) {
  return status.error ? status.error->description : "Unknown";
}

// Whether the source counts at least one record or cannot count.
bool holdsRecordsOrFails(const platform::DataSourcePtr& source) {
  const auto counted = platform::services().syncDataSource.countRecords(source);
  if (!counted.status.isSuccess())
    platform::logToSystem(
        "Cound not get the count of records in the tethered sync data source. Error = %@",
        errorOrUnknown(counted.status));
  return counted.count != 0 || !counted.status.isSuccess();
}

bool isLetterOrDigit(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
         static_cast<unsigned char>(c) > 127;
}

// Of every word, a run of letters and digits, the first letter in upper case and the others in
// lower case. Only ASCII letters have a case here.
std::string capitalised(std::string text) {
  bool letterSeen = false;
  for (char& c : text) {
    if (!isLetterOrDigit(c)) {
      letterSeen = false;
      continue;
    }
    if (c >= 'a' && c <= 'z' && !letterSeen)
      c = static_cast<char>(c - 'a' + 'A');
    else if (c >= 'A' && c <= 'Z' && letterSeen)
      c = static_cast<char>(c - 'A' + 'a');
    if ((c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z')) letterSeen = true;
  }
  return text;
}

}  // namespace

std::optional<SyncDataType> AccountSettingsOrvetteSyncTypeForDataclass(std::string_view dataclass) {
  if (dataclass == kAccountDataclassMail) return platform::MailAccountsSyncType;
  if (dataclass == kAccountDataclassContacts) return platform::ContactsSyncType;
  if (dataclass == kAccountDataclassCalendars) return platform::CalendarsSyncType;
  if (dataclass == kAccountDataclassBookmarks) return platform::BookmarksSyncType;
  if (dataclass == kAccountDataclassReminders) return platform::CalendarsSyncType;
  if (dataclass == kAccountDataclassNotes) return platform::NotesSyncType;
  return std::nullopt;
}

std::optional<std::string> AccountSettingsOrvetteSyncDataclassNameForDataclass(
    std::string_view dataclass) {
  const std::optional<SyncDataType> type = AccountSettingsOrvetteSyncTypeForDataclass(dataclass);
  return type ? platform::services().syncDataSource.dataclassNameForSyncType(*type) : std::nullopt;
}

bool AccountSettingsDoesLocalDataExistForDataclass(std::string_view dataclass) {
  if (std::find(kNeverLocal.begin(), kNeverLocal.end(), dataclass) != kNeverLocal.end())
    return false;
  DataSourceOptions options;
  if (dataclass == kAccountDataclassReminders)
    options = {{platform::RemindersOnlySourceOption, true}};
  else if (dataclass == kAccountDataclassCalendars)
    options = {{platform::EventsOnlySourceOption, true}};

  const std::optional<std::string> name =
      AccountSettingsOrvetteSyncDataclassNameForDataclass(dataclass);
  if (!name) return true;
  platform::SyncDataSource& sources = platform::services().syncDataSource;
  const auto created = sources.createDataSource(name, std::nullopt, options);
  if (created.status.error)
    platform::logToSystem("Error creating data source. Error = %@", created.status.error);
  const bool exists =
      !created.status.isSuccess() || (created.source && holdsRecordsOrFails(created.source));
  if (created.source) {
    const platform::Status closed = sources.deleteDataSource(created.source);
    if (!closed.isSuccess())
      platform::logToSystem("Cound not delete the tethered sync data source object. Error = %@",
                            errorOrUnknown(closed));
  }
  return exists;
}

std::optional<std::string> _addressDomainForAddress(std::string_view address) {
  const std::size_t at = address.find('@');
  if (at == std::string_view::npos || at + 1 >= address.size()) return std::nullopt;
  return std::string(address.substr(at + 1));
}

std::optional<std::string> AccountSettingsDescriptionFromEmailAddress(const std::string& address) {
  const std::optional<std::string> domain = _addressDomainForAddress(address);
  if (!domain) return std::nullopt;
  const auto dots = std::count(domain->begin(), domain->end(), '.');
  if (dots == 0) return address;
  if (dots == 1) return capitalised(domain->substr(0, domain->find('.')));
  return domain;
}

bool AccountSettingsAccountDescriptionAlreadyExists(std::string_view description) {
  const auto accounts = ASSAccountsManager::init()->allBasicAccounts();
  return std::any_of(accounts->begin(), accounts->end(), [&](const AccountPtr& account) {
    return account->type() != kSMTPAccountType && account->displayName() == description;
  });
}

}  // namespace localdata
