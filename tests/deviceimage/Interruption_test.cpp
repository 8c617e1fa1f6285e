// A migration whose process dies, or whose disk says no, before any of its writes; and then again.
#include <gmock/gmock.h>
#include <sqlite3.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>

#include "deviceimage/DeviceImageServices.h"
#include "tests/deviceimage/TemporaryImage.h"

namespace deviceimage {
namespace {

using Lines = std::vector<std::string>;

constexpr const char* kAccount = "Quillnet:ada";

// Every call of SQLite that changes a file goes through these; the one whose turn it is kills the
// process, or fails.
enum class Fate { kill, fail };
int callsLeft = 0;
Fate fate = Fate::kill;

bool isTurn() {
  if (callsLeft == 0 || --callsLeft != 0) return false;
  if (fate == Fate::kill) ::raise(SIGKILL);
  errno = ENOSPC;
  return true;
}
ssize_t countedWrite(int file, const void* bytes, size_t size, off_t offset) {
  return isTurn() ? -1 : ::pwrite(file, bytes, size, offset);
}
int countedTruncate(int file, off_t size) { return isTurn() ? -1 : ::ftruncate(file, size); }
int countedUnlink(const char* path) { return isTurn() ? -1 : ::unlink(path); }

void countCalls(Fate wanted, int calls) {
  sqlite3_initialize();
  sqlite3_vfs* const vfs = sqlite3_vfs_find(nullptr);
  const auto replace = [&](const char* name, auto* function) {
    return vfs->xSetSystemCall(vfs, name, reinterpret_cast<sqlite3_syscall_ptr>(function)) ==
           SQLITE_OK;
  };
  // Which of the first two is there depends on how SQLite was built; 64-bit systems mean the same
  // by both.
  const bool countsWrites = replace("pwrite", countedWrite);
  const bool countsWideWrites = replace("pwrite64", countedWrite);
  if (!(countsWrites || countsWideWrites) || !replace("ftruncate", countedTruncate) ||
      !replace("unlink", countedUnlink))
    ::_exit(3);
  fate = wanted;
  callsLeft = calls;
}

// One dataclass as the migration treats it: merge, then remove, each with its own sources. A failed
// merge does not keep the store from being removed.
void migrate(platform::SyncDataSource& sources, const char* name) {
  const auto open = [&](const std::optional<std::string>& account) {
    return sources.createDataSource(name, account, std::nullopt).source;
  };
  const platform::DataSourcePtr local = open(std::nullopt);
  const platform::DataSourcePtr service = open(kAccount);
  sources.migrateRecords(service, local).ignore("as the migration does");
  sources.commit(local).ignore("as the migration does");
  sources.deleteDataSource(local).ignore("as the migration does");
  sources.commit(service).ignore("as the migration does");
  sources.deleteDataSource(service).ignore("as the migration does");
  const platform::DataSourcePtr removed = open(kAccount);
  if (std::string_view(name) == "Calendars")
    sources.clearAllRecords(removed).ignore("as the migration does");
  else
    sources.removeStore(removed, false).ignore("as the migration does");
  sources.commit(removed).ignore("as the migration does");
  sources.deleteDataSource(removed).ignore("as the migration does");
}

// Migrates in a process of its own; false when that was killed.
bool migrateInAChild(const TemporaryImage& image, Fate wanted, int calls, bool& isOver) {
  const pid_t child = ::fork();
  if (child == 0) {
    countCalls(wanted, calls);
    {
      DeviceImageServices services(image.image);
      for (const char* name : {"Contacts", "Calendars"})
        migrate(services.services().syncDataSource, name);
    }
    ::_exit(callsLeft > 0 ? 0 : 1);  // 0: every call had its turn
  }
  int status = 0;
  ::waitpid(child, &status, 0);
  isOver = WIFEXITED(status) && WEXITSTATUS(status) == 0;
  EXPECT_FALSE(WIFEXITED(status) && WEXITSTATUS(status) == 3) << "SQLite's calls cannot be counted";
  return WIFEXITED(status);
}

void fill(const TemporaryImage& image) {
  RecordStores stores = image.stores();
  const auto add = [&](Dataclass dataclass, const std::optional<std::string>& account,
                       const std::vector<NewRecord>& records) {
    ASSERT_TRUE(stores.addRecords(dataclass, account, records).status.isSuccess());
  };
  add(Dataclass::contacts, kAccount,
      {record("a", "Ada"), record("b", "Bo"), record("c", std::string(20'000, 'c'))});
  add(Dataclass::contacts, std::nullopt, {record("a", "Ada"), record("own", "Own")});
  add(Dataclass::calendars, kAccount, {record("e", "event", 1, {"Home"})});
  add(Dataclass::reminders, kAccount, {record("t", "todo")});
}

Lines sorted(Lines lines) {
  std::sort(lines.begin(), lines.end());
  return lines;
}

// Everything that the service had is local or retired, exactly once in each, and nothing else is
// local.
void expectNothingLostOrDoubled(const TemporaryImage& image) {
  const Lines service = {"a: Ada", "b: Bo", "c: " + std::string(20'000, 'c')};
  Lines local = linesOf(image, Dataclass::contacts);
  Lines retired = retiredLinesOf(image, Dataclass::contacts, kAccount);
  EXPECT_EQ(sorted(retired), service);
  ASSERT_TRUE(local == (Lines{"a: Ada", "own: Own"}) ||
              local == (Lines{"a: Ada", "b: Bo", service[2], "own: Own"}));
  EXPECT_EQ(retiredLinesOf(image, Dataclass::calendars, kAccount), Lines{"e: event"});
  EXPECT_EQ(retiredLinesOf(image, Dataclass::reminders, kAccount), Lines{"t: todo"});
  EXPECT_EQ(databaseProblems(image), Lines{});
}

TEST(InterruptedMigration, LosesAndDoublesNothingWhereverItIsKilledOnceItHasRunAgain) {
  const TemporaryImage filled;
  fill(filled);
  bool isOver = false;
  int kills = 0;
  for (int calls = 1; !isOver; ++calls) {
    SCOPED_TRACE(calls);
    const TemporaryImage image(filled);
    if (!migrateInAChild(image, Fate::kill, calls, isOver)) ++kills;
    ASSERT_TRUE(image.stores().recoverDatabases().isSuccess());
    EXPECT_EQ(databaseProblems(image), Lines{});
    bool again = false;
    ASSERT_TRUE(migrateInAChild(image, Fate::kill, 0, again));
    expectNothingLostOrDoubled(image);
    // A migration that was only killed, and never failed, moves everything.
    EXPECT_EQ(linesOf(image, Dataclass::contacts).size(), 4U);
    EXPECT_EQ(linesOf(image, Dataclass::reminders), Lines{"t: todo"});
    if (HasFailure()) return;
  }
  EXPECT_GT(kills, 20);
}

TEST(FailingMigration, LosesAndDoublesNothingWhicheverWriteFails) {
  const TemporaryImage filled;
  fill(filled);
  bool isOver = false;
  for (int calls = 1; !isOver; ++calls) {
    SCOPED_TRACE(calls);
    const TemporaryImage image(filled);
    ASSERT_TRUE(migrateInAChild(image, Fate::fail, calls, isOver));
    ASSERT_TRUE(image.stores().recoverDatabases().isSuccess());
    EXPECT_EQ(databaseProblems(image), Lines{});
    bool again = false;
    ASSERT_TRUE(migrateInAChild(image, Fate::kill, 0, again));
    expectNothingLostOrDoubled(image);
    if (HasFailure()) return;
  }
}

TEST(ReadingOnly, SaysWhatToDoAboutADatabaseThatAKilledProgramLeftHalfWritten) {
  const TemporaryImage filled;
  fill(filled);
  bool isOver = false;
  int found = 0;
  for (int calls = 1; !isOver; ++calls) {
    const TemporaryImage image(filled);
    migrateInAChild(image, Fate::kill, calls, isOver);
    RecordStores reading(image.image, RecordStores::Access::readOnly);
    const platform::Status status = reading.listStores().status;
    if (status.isSuccess()) continue;  // this kill left nothing to roll back
    ++found;
    EXPECT_THAT(status.error->description, testing::HasSubstr("open the image for writing once"));
    ASSERT_TRUE(image.stores().recoverDatabases().isSuccess());
    EXPECT_TRUE(reading.listStores().status.isSuccess());
  }
  EXPECT_GT(found, 3);
}

TEST(TwoProcesses, CommitIntoOneDatabaseWhileBothHaveSourcesOpen) {
  const TemporaryImage image;
  fill(image);
  DeviceImageServices services(image.image);
  platform::SyncDataSource& sources = services.services().syncDataSource;
  const pid_t child = ::fork();
  if (child == 0) {
    {
      DeviceImageServices own(image.image);
      migrate(own.services().syncDataSource, "Contacts");
    }
    ::_exit(0);
  }
  const auto local = sources.createDataSource("Contacts", std::nullopt, std::nullopt).source;
  const auto service = sources.createDataSource("Contacts", kAccount, std::nullopt).source;
  EXPECT_EQ(sources.migrateRecords(service, local).code, 0);
  EXPECT_GE(sources.countRecords(local).count, 2);
  int status = 0;
  ::waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(sources.commit(local).code, 0);
  EXPECT_EQ(sources.countRecords(local).count, 4);
  EXPECT_EQ(databaseProblems(image), Lines{});
}

}  // namespace
}  // namespace deviceimage
