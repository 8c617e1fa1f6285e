#pragma once

#include <string_view>

#include "propertylist/Value.h"

namespace accountsettings {

// What happened to an account.
enum class AccountChangeType { added = 0, modified = 1, deleted = 2 };

// One change, as notifiers are told it: a dictionary with the keys below.
using AccountChangeRecord = propertylist::Dictionary;

// An AccountChangeType as an integer.
inline constexpr std::string_view kASChangeAccountChangeTypeKey = "ChangeType";
inline constexpr std::string_view kASChangeAccountIdentifierKey = "AccountID";
inline constexpr std::string_view kASChangeAccountTypeKey = "AccountType";
// The account's list of enabled dataclasses before the change, as it was; an empty array for an
// account without one.
inline constexpr std::string_view kASChangeAccountOriginallyEnabledDataclassesKey =
    "OriginalDataclasses";

}  // namespace accountsettings
