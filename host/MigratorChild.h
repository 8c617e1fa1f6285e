#pragma once

namespace host {

// What the host starts the process of a data-class migrator with: this, the image, the bundle's
// folder, its executable, its principal class, and the databases that it is to leave alone (see
// joinedPaths). Not for people.
inline constexpr const char* kRunMigratorArgument = "--run-migrator-in-this-process";
inline constexpr int kRunMigratorArgumentCount = 7;

// Whether the program was started to run a migrator.
bool isMigratorProcess(int argumentCount, char** arguments);

// Runs the migrator to its end, tells the host, and gives the exit status of the process. Nothing
// of the host's own may have been set up before.
int runMigratorInThisProcess(char** arguments);

}  // namespace host
