#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "deviceimage/SyncAgent.h"
#include "host/Observation.h"
#include "host/Settings.h"

namespace host {

// The accounts that only the settings file from before has, when another one was made in its place:
// one sentence each. `keptCopy` is the path of the copy of the one before; empty without one.
std::vector<std::string> leftByNewSettings(const Settings& before, const Settings& now,
                                           const std::string& keptCopy);

// The records in active stores whose names begin with `prefix` and of which no account is there
// (any more), so that no migrator moves them: one sentence a store. A run that failed half way, or
// left a database alone, leaves such.
std::vector<std::string> recordsWithoutAccount(const Observation& now,
                                               const deviceimage::SyncAgent& agent,
                                               std::string_view prefix);

}  // namespace host
