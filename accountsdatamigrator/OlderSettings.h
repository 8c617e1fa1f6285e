#pragma once

#include <optional>

#include "propertylist/Value.h"

namespace accountsdatamigrator {

// The version of the settings file that is written.
inline constexpr std::int64_t kSettingsVersion = 12;

// Whether a settings file with this root is older than that. One without a version, and one with a
// negative version, which counts as newer than any, is not.
bool isOutdated(const propertylist::Dictionary& root);

// The root brought up to date: every account and every key stays, known or not. Accounts and child
// accounts without a text under "Identifier" get one, because a child without is no child for the
// account settings library, and an account without gets another at each load; the account that
// stands for the device has a fixed one that no file holds. Empty when the device makes no
// identifier.
std::optional<propertylist::Dictionary> broughtUpToDate(propertylist::Dictionary root);

}  // namespace accountsdatamigrator
