#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/SyncDataType.h"

// What the reconciliation of local data asks about dataclasses, and the descriptions of accounts
// made from e-mail addresses. Nothing is kept between calls; what fails is logged and ends in the
// stated answer.
namespace localdata {

// The kind of synced data behind a dataclass; empty when it is none that is synced. Reminders and
// calendars are one kind: a source option tells them apart.
std::optional<platform::SyncDataType> AccountSettingsOrvetteSyncTypeForDataclass(
    std::string_view dataclass);

// The name under which the platform opens data sources of the dataclass; empty when it has none.
std::optional<std::string> AccountSettingsOrvetteSyncDataclassNameForDataclass(
    std::string_view dataclass);

// Whether the device-local store holds records of the dataclass. When the platform cannot tell, the
// answer is true, because a caller does harm only by taking data for absent. Dataclasses that never
// live on the device alone (mail, documents, photo streams, cards) are always false.
bool AccountSettingsDoesLocalDataExistForDataclass(std::string_view dataclass);

// The text behind the first "@"; empty when there is no "@" or nothing behind it.
std::optional<std::string> _addressDomainForAddress(std::string_view address);

// A name to show for the account of an e-mail address: of a domain with two labels the first one,
// capitalised; a domain with more as it stands; the whole address when the domain has no dot. Empty
// without a domain.
std::optional<std::string> AccountSettingsDescriptionFromEmailAddress(const std::string& address);

// Whether a top-level account other than an outgoing mail server is shown under exactly this name.
bool AccountSettingsAccountDescriptionAlreadyExists(std::string_view description);

}  // namespace localdata
