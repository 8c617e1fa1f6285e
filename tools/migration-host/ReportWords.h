#pragma once

#include <string_view>

#include "host/Report.h"

namespace migration_host {

// The words of a report, the same in both its forms.
std::string_view wordFor(host::RunOutcome outcome);
std::string_view wordFor(host::AccountOutcome outcome);
std::string_view wordFor(host::Ending ending);

}  // namespace migration_host
