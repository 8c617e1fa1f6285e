#pragma once

#include <string>

#include "host/Report.h"

namespace migration_host {

// The report for people: a line or two for each account, the migrators that did not do well, and a
// last line with the outcome. `colours` asks for terminal colours. Control characters in names are
// shown as "?", so that no account can move the cursor.
std::string textReport(const host::MigrationReport& report, bool colours);

// `text` with every control character shown as "?".
std::string printable(std::string_view text);

}  // namespace migration_host
