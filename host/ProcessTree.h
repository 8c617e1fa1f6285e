#pragma once

#include <sys/types.h>

#include <optional>

namespace host {

// Makes the calling process the one to which processes fall whose own parent has ended, so that
// what a migrator leaves running can be found. False when the system refuses.
bool adoptOrphans();

// How the children of the calling process ended.
struct EndedChildren {
  bool all = false;           // none is left
  std::optional<int> status;  // how the awaited one ended, as waitpid tells; empty when it is left
};

// Kills every child of the calling process and whatever falls to it meanwhile, and takes their ends
// away, for ten seconds at the most. Longer lasts only what the kernel itself holds or what the
// caller has no right to kill.
EndedChildren endAllChildren(pid_t awaited);

}  // namespace host
