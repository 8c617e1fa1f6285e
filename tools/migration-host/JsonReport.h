#pragma once

#include <string>

#include "host/Report.h"

namespace migration_host {

// The report for programs, as docs/migration-report.schema.json describes it; ends with a line end.
// What is not UTF-8 in names and lines is shown with replacement characters.
std::string jsonReport(const host::MigrationReport& report);

}  // namespace migration_host
