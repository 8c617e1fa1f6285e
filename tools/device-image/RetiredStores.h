#pragma once

#include <optional>
#include <vector>

#include "deviceimage/RecordStores.h"

namespace tools {

// The retired stores of the dataclass, the oldest first, or the one with that number. Ends the
// command when there is no store of that number.
std::vector<deviceimage::Store> retiredStores(deviceimage::RecordStores& records,
                                              deviceimage::Dataclass dataclass,
                                              std::optional<deviceimage::Row> number);

}  // namespace tools
