#pragma once

#include <sys/types.h>

#include <optional>
#include <set>

namespace host {

// Makes the calling process the one to which processes fall whose own parent has ended, so that
// what a migrator leaves running can be found. False when the system refuses.
bool adoptOrphans();

// How the children of the calling process ended.
struct EndedChildren {
  bool all = false;           // none is left but those that are spared
  std::optional<int> status;  // how the awaited one ended, as waitpid tells; empty when it is left
};

// The sessions of the calling process and of everything below it. The caller may have had children
// before its program was run; a process that begins a session of its own cannot enter one of these.
using Sessions = std::set<pid_t>;
Sessions sessionsOfFamily();

// Kills every child of the calling process that is not in the sessions to be spared, and whatever
// falls to it meanwhile, and takes the ends of children away, for ten seconds at the most. Longer
// lasts only what the kernel itself holds or what the caller has no right to kill. The awaited one
// is never spared.
EndedChildren endAllChildren(pid_t awaited, const Sessions& spared);

}  // namespace host
