#pragma once

#include <string>
#include <vector>

#include "deviceimage/SyncAgent.h"
#include "host/Observation.h"
#include "host/Settings.h"

namespace host {

// What a settings file that was made anew has left out, one sentence each: the accounts that only
// the one before had, and the records in active stores of which no account is there any more.
// `keptCopy` is the path of the copy of the one before; empty without one.
std::vector<std::string> leftByNewSettings(const Settings& before, const Observation& now,
                                           const deviceimage::SyncAgent& agent,
                                           const std::string& keptCopy);

}  // namespace host
