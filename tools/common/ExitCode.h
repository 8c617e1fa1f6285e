#pragma once

#include <stdexcept>
#include <string>

namespace tools {

// How a run ended, as the man page promises it. The numbers never change.
enum class ExitCode {
  done = 0,
  unexpectedFailure = 1,
  wrongUsage = 2,
  someRecordsBad = 4,  // the others were imported
  imageDamaged = 6,    // or check found something
  refused = 7,         // nothing was written
  timedOut = 9,        // what was waited for did not come in time
  daemonRuns = 10,     // the data-access daemon runs all the same
  heldByAnotherRun = 11
};

// Ends a command. The text names the file, what is wrong with it and the remedy.
class CommandFailure : public std::runtime_error {
 public:
  CommandFailure(ExitCode code, const std::string& text) : std::runtime_error(text), _code(code) {}
  ExitCode code() const { return _code; }

 private:
  ExitCode _code;
};

}  // namespace tools
