#pragma once

#include <chrono>
#include <cstddef>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "host/Interruption.h"

namespace host {

// How one run of a migrator ended.
enum class Ending {
  succeeded,    // performMigration answered true, and the process ended as it should
  failed,       // performMigration answered false
  notNeeded,    // another program had done the work
  notBegun,     // what must come before the migrator failed; none of its code was run
  busy,         // it ran past its limit while it waited for a lock of another program
  notLoaded,    // no code of the migrator's own was run but that of its loading
  raised,       // an exception came out of it
  crashed,      // a signal ended its process
  left,         // its process ended without an answer, or left some that could not be ended
  timedOut,     // it ran past its limit and was killed
  interrupted,  // the user stopped it
  notStarted    // the system gave no process
};

struct MigratorOutcome {
  Ending ending = Ending::notStarted;
  std::string detail;  // more than the ending says, for people; may be empty
  std::string name;    // what the migrator calls itself, else the bundle's name
  std::chrono::milliseconds duration{0};
  std::string output;  // what it wrote to its standard output and error, cut at kMaximumOutput
  bool outputWasCut = false;
};

// What there is to say of an outcome: one sentence; empty when the migrator succeeded.
std::string sentenceFor(const MigratorOutcome& migrator);

inline constexpr std::size_t kMaximumOutput = std::size_t{64} * 1024;

struct MigratorTask {
  std::string name;  // what the migrator is called until it says so itself
  // What this program is started with anew: one of its child arguments, and what belongs to that.
  std::vector<std::string> arguments;
  std::string temporaryDirectory;
  int lockDescriptor = -1;  // the image's lock, which the process is to share
  std::chrono::seconds limit{0};
};

// Gets each line that the migrator writes to the system log, as it comes.
using LineSink = std::function<void(std::string_view line)>;

// Runs a migrator in a process of its own and comes back in time, whatever it does:
//
// - The process is this program anew (/proc/self/exe with the task's arguments), so that it
//   inherits nothing but umask 077, its end of the channel and the image's lock. Its environment is
//   TMPDIR alone, in a build with sanitizers their options too. It is in a session of its own, its
//   address space is limited, and it dies with the host.
// - Past the limit of the task, or when the user interrupts, it is killed.
// - When it has ended, every process that it left behind is killed, and none remains a zombie.
//   Children that the caller had before, as a program run by a shell's exec may, are left alone,
//   and so is what is in their sessions; it starts none meanwhile, and has called adoptOrphans.
//   Processes that cannot be killed within ten seconds are left alone, and the migrator counts as
//   having left.
MigratorOutcome runMigrator(const MigratorTask& task, Interruption& interruption,
                            const LineSink& sink);

}  // namespace host
