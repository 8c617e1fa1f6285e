#pragma once

#include <string>
#include <string_view>

#include "deviceimage/Dataclass.h"
#include "platform/Status.h"

namespace tools {

// The dataclass of that name: one that records are imported to and exported from.
deviceimage::Dataclass recordDataclassNamed(const std::string& name);

// Passes on a success; a failure of the image's databases ends the command. A change that failed
// has changed nothing.
void requireSuccess(const platform::Status& status, std::string_view whatFailed);

}  // namespace tools
