#pragma once

#include <sys/types.h>

#include <optional>

#include "deviceimage/Descriptor.h"
#include "host/ChildChannel.h"
#include "host/MigratorProcess.h"

namespace host {

// A process that runs a migrator, as the host holds it.
struct LaunchedMigrator {
  pid_t identifier = 0;
  deviceimage::Descriptor ended;    // readable when the process has ended
  deviceimage::Descriptor channel;  // its messages
  deviceimage::Descriptor output;   // its standard output and error; reading does not wait
};

// Starts the process of runMigrator. Empty when the system gives no process or no descriptor; errno
// says why.
std::optional<LaunchedMigrator> launchMigrator(const MigratorTask& task);

}  // namespace host
