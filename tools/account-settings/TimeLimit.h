#pragma once

#include <string>

#include "tools/common/ExitCode.h"

namespace tools {

// Ends the process when an operation that waits without a limit of its own takes too long: while
// the object lives, for calls that leave nothing half done. One at a time, in a program with one
// thread.
class TimeLimit {
 public:
  // What is said when the time is up.
  struct Ending {
    ExitCode code = ExitCode::timedOut;
    std::string output;   // to standard output
    std::string message;  // to standard error; a whole line
  };
  //   seconds  a microsecond or more
  TimeLimit(double seconds, Ending ending);
  ~TimeLimit();
  TimeLimit(const TimeLimit&) = delete;
  TimeLimit& operator=(const TimeLimit&) = delete;

 private:
  Ending _ending;
};

}  // namespace tools
