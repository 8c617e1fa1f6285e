#include "tools/device-image/Images.h"

#include <fmt/format.h>
#include <sqlite3.h>

#include <cstdio>
#include <utility>

#include "tools/device-image/ExitCode.h"

namespace deviceimagetool {

using deviceimage::Dataclass;
using deviceimage::ImageLock;

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

ImagePtr openImage(const std::string& path) {
  deviceimage::OpenedImage opened = deviceimage::DeviceImage::open(path);
  if (!opened.image) throw CommandFailure(ExitCode::refused, opened.error);
  return std::move(opened.image);
}

LockedImage lockImage(ImagePtr image) {
  ImageLock::Attempt attempt = ImageLock::tryAcquire(*image);
  if (attempt.outcome == ImageLock::Outcome::heldByAnother)
    throw CommandFailure(ExitCode::heldByAnotherRun, attempt.error);
  if (attempt.outcome != ImageLock::Outcome::held)
    throw CommandFailure(ExitCode::refused, attempt.error);
  return {std::move(image), std::move(attempt.lock)};
}

LockedImage openImageForWriting(const std::string& path) { return lockImage(openImage(path)); }

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

void printMessage(std::string_view text) {
  std::string line = "device-image: ";
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte < 0x20 || byte == 0x7F)
      line += fmt::format("\\x{:02x}", byte);
    else
      line += c;
  }
  line += '\n';
  std::fwrite(line.data(), 1, line.size(), stderr);
}

}  // namespace deviceimagetool
