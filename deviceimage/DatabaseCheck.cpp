// Looking whether the databases are sound.
#include <sqlite3.h>

#include "deviceimage/ContentHash.h"
#include "deviceimage/Database.h"
#include "deviceimage/RecordStores.h"

namespace deviceimage {
namespace {

constexpr std::size_t kMostProblems = 100;  // of one database; more say nothing new

void checkIntegrity(Database& database, std::vector<std::string>& problems) {
  Statement integrity(database, "PRAGMA integrity_check");
  while (integrity.step())
    if (integrity.bytes(0) != "ok") problems.push_back(integrity.text(0));
  Statement references(database, "PRAGMA foreign_key_check");
  while (references.step() && problems.size() < kMostProblems)
    problems.push_back("row " + references.text(1) + " of table \"" + references.text(0) +
                       "\" refers to a row of \"" + references.text(2) + "\" that is not there");
}

void checkHashes(Database& database, std::vector<std::string>& problems) {
  Statement records(database, "SELECT id, uid, content_hash, content FROM records");
  while (records.step() && problems.size() < kMostProblems)
    if (contentHash(records.bytes(3)) != records.bytes(2))
      problems.push_back("record " + records.text(0) + " (\"" + records.text(1) +
                         "\") has another content than its hash says");
}

// Whether the failure tells nothing of the file. What is no file cannot be opened at any time.
bool mayPass(int code, const FileLook& look) {
  switch (code & 0xFF) {  // the kind of an SQLite code
    case SQLITE_IOERR:
    case SQLITE_NOMEM:
    case SQLITE_FULL:
    case SQLITE_PROTOCOL:  // locks could not be taken
    case SQLITE_READONLY:  // what a killed program left could not be rolled back
      return true;
    case SQLITE_CANTOPEN:
      return look.kind == FileLook::Kind::file;
    default:
      return false;
  }
}

void note(const platform::Status& status, const FileLook& look, DatabaseReport& report) {
  if (status.isSuccess()) return;
  report.problems.push_back(status.error->description);
  report.mayPass = mayPass(status.code, look);
}

}  // namespace

std::vector<DatabaseReport> RecordStores::checkDatabases(const std::set<std::string>& leaveOut) {
  std::vector<DatabaseReport> reports;
  for (const Dataclass dataclass : kDataclasses) {
    if (dataclass == Dataclass::reminders) continue;  // in the calendars' database
    const platform::SyncDataType type = syncTypeOf(dataclass);
    DatabaseReport report;
    report.path = DeviceImage::databaseFile(type);
    if (leaveOut.contains(report.path)) continue;
    const FileLook look = _databases->image().lookAt(report.path);
    report.exists = look.kind != FileLook::Kind::nothing;
    const platform::Status status = statusOf([&] {
      if (Database* const database = _databases->find(type)) {
        checkIntegrity(*database, report.problems);
        if (report.problems.empty()) checkHashes(*database, report.problems);
      }
      return platform::Status::success();
    });
    note(status, look, report);
    reports.push_back(std::move(report));
  }
  return reports;
}

platform::Status RecordStores::recoverDatabases(const std::set<std::string>& leaveOut) {
  platform::Status first;
  for (const Dataclass dataclass : kDataclasses) {
    const std::string path(DeviceImage::databaseFile(syncTypeOf(dataclass)));
    const bool isWhole =
        _databases->image().lookAt(path + "-journal").kind == FileLook::Kind::nothing;
    if (isWhole || leaveOut.contains(path)) continue;
    // Opening reads the schema, and the first read rolls back.
    platform::Status status = statusOf([&] {
      if (Database* const database = _databases->find(syncTypeOf(dataclass)))
        Statement(*database, "SELECT count(*) FROM stores").run();
      return platform::Status::success();
    });
    if (first.isSuccess()) first = std::move(status);
  }
  return first;
}

DatabaseReport RecordStores::tryToWrite(Dataclass dataclass) {
  DatabaseReport report;
  report.path = DeviceImage::databaseFile(syncTypeOf(dataclass));
  const FileLook look = _databases->image().lookAt(report.path);
  report.exists = look.kind != FileLook::Kind::nothing;
  note(statusOf([&] {
         if (Database* const database = _databases->find(syncTypeOf(dataclass)))
           const Transaction transaction(*database);
         return platform::Status::success();
       }),
       look, report);
  return report;
}

}  // namespace deviceimage
