#pragma once

#include <sys/types.h>

namespace host {

// Makes the calling process the one to which processes fall whose own parent has ended, so that
// what a migrator leaves running can be found. False when the system refuses.
bool adoptOrphans();

// Kills every child of the calling process and whatever falls to it meanwhile, and waits for their
// ends, for ten seconds at the most: only a process that the kernel itself holds lasts longer.
void killAllChildren();

}  // namespace host
