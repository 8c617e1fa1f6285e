#include "tools/device-image/Records.h"

#include <fmt/format.h>
#include <sqlite3.h>

#include <optional>

#include "tools/common/ExitCode.h"

namespace tools {

using deviceimage::Dataclass;

namespace {

// What a result code of SQLite means for the user.
ExitCode exitCodeOf(int databaseCode) {
  switch (databaseCode & 0xFF) {
    case SQLITE_CORRUPT:
    case SQLITE_NOTADB:
    case SQLITE_SCHEMA:
      return ExitCode::imageDamaged;
    case SQLITE_BUSY:
      return ExitCode::heldByAnotherRun;
    case SQLITE_READONLY:
    case SQLITE_CANTOPEN:
    case SQLITE_PERM:
      return ExitCode::refused;
    default:
      return ExitCode::unexpectedFailure;
  }
}

}  // namespace

Dataclass recordDataclassNamed(const std::string& name) {
  const std::optional<Dataclass> dataclass = deviceimage::dataclassNamed(name);
  if (!dataclass || *dataclass == Dataclass::mail)
    throw CommandFailure(ExitCode::wrongUsage,
                         fmt::format("there is no dataclass \"{}\"; give contacts, calendars, "
                                     "reminders, bookmarks or notes",
                                     name));
  return *dataclass;
}

void requireSuccess(const platform::Status& status, std::string_view whatFailed) {
  if (status.isSuccess()) return;
  throw CommandFailure(exitCodeOf(status.code),
                       fmt::format("{}: {}", whatFailed,
                                   status.error ? status.error->description
                                                : fmt::format("status {}", status.code)));
}

}  // namespace tools
