#pragma once

#include <sys/types.h>

#include <cstddef>
#include <string>
#include <vector>

#include "platform/Export.h"
#include "platform/Status.h"

namespace platform {

// The processes of the device, and what the system does to them.
class PLATFORM_EXPORT ProcessTable {
 public:
  struct Process {
    pid_t identifier = 0;
    std::string commandName;  // at most 16 bytes count
  };
  struct Sized {
    Status status;
    std::size_t count = 0;  // room for this many processes
  };
  struct Filled {
    Status status;
    std::vector<Process> processes;  // in the kernel's order
  };

  virtual ~ProcessTable();
  // How much room a copy of the table needs now.
  virtual Sized sizeOfTable() = 0;
  // The table, when it fits into `capacity` entries; a failure when it has grown past them.
  virtual Filled fillTable(std::size_t capacity) = 0;
  virtual pid_t ownProcessIdentifier() = 0;
  // Sends signal number `signal` to a process of the last fillTable. Fails for a number that was
  // not listed then, and must not hit a process that has taken the number over since.
  virtual Status sendSignal(pid_t process, int signal) = 0;
};

}  // namespace platform
