#pragma once

#include <string>

namespace host {

// Where the process that runs a migrator finds its end of the channel, and the image's lock, which
// it shares: when the host is killed, the image is free no sooner than the migrator has ended.
inline constexpr int kChannelDescriptor = 3;
inline constexpr int kLockDescriptor = 4;

// What the host starts that process with: this, the image, the bundle's folder, its executable and
// its principal class. Not for people.
inline constexpr const char* kRunMigratorArgument = "--run-migrator-in-this-process";
inline constexpr int kRunMigratorArgumentCount = 6;

// Whether the program was started to run a migrator.
bool isMigratorProcess(int argumentCount, char** arguments);

// Runs the migrator to its end, tells the host, and gives the exit status of the process. Nothing
// of the host's own may have been set up before.
int runMigratorInThisProcess(char** arguments);

}  // namespace host
