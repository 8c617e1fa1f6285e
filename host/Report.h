#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

#include "deviceimage/Dataclass.h"
#include "host/LegacyStep.h"
#include "host/MigratorProcess.h"

namespace host {

// The exit codes of a run. Stable: programs rely on them. (2 is wrong usage and given elsewhere.)
enum class RunOutcome {
  done = 0,                // done and verified
  failed = 1,              // an unexpected failure
  leftBehind = 3,          // done, but records or accounts were left behind
  verificationFailed = 5,  // what was there before is not all accounted for
  refused = 7,             // a check before the start refused; nothing was written but by a legacy
                           // step before
  migratorFailed = 8,      // a migrator crashed, raised, left or ran past its limit
  busy = 11,               // another run holds the image, or another program its settings
  interrupted = 130
};

// What became of one top-level account of before.
enum class AccountOutcome {
  retired,      // was to be retired and is gone
  kept,         // was to be retired and is still there
  notSelected,  // was not, and is still there
  dropped       // was not, and is gone all the same
};

struct AccountReport {
  std::string identifier;
  std::string type;
  std::string displayName;
  AccountOutcome outcome = AccountOutcome::notSelected;
};

// What became of the records that one account to be retired had of one dataclass. Every record of
// before is counted once, in the first account of the file that its store belongs to:
//
//   serviceBefore = moved + alreadyThere + conflictCopies + retired + leftBehind
//
// and, summed over the accounts, localAfter = localBefore + moved + conflictCopies. The two local
// figures are those of the whole dataclass, the same in each of its lines.
struct DataclassReport {
  std::string account;  // its identifier
  deviceimage::Dataclass dataclass = deviceimage::Dataclass::contacts;
  std::int64_t serviceBefore = 0;  // in the account's active stores
  std::int64_t localBefore = 0;
  std::int64_t localAfter = 0;
  std::int64_t moved = 0;           // new in the local store
  std::int64_t alreadyThere = 0;    // the local store had an equal one
  std::int64_t conflictCopies = 0;  // new in the local store, which had another version
  std::int64_t retired = 0;         // not in the local store, but in a retired one
  std::int64_t leftBehind = 0;      // still in the account's active store alone
};

// All that a run has to say.
struct MigrationReport {
  std::string image;  // the path as it was given, or without links once it was opened
  RunOutcome outcome = RunOutcome::failed;
  std::vector<std::string> reasons;  // sentences: why refused, what was left, what does not add up
  std::optional<LegacyReport> legacy;  // of the legacy step; none when it was not asked for
  std::vector<MigratorOutcome> migrators;
  std::vector<AccountReport> accounts;
  std::vector<DataclassReport> dataclasses;
  bool balanced = false;         // all sums close and nothing else changed
  std::vector<std::string> log;  // what the migrators wrote to the system log, in order
  bool logWasCut = false;        // the log went on past what a report holds
};

}  // namespace host
