#pragma once

#include <set>
#include <string>
#include <vector>

#include "platform/ProcessTable.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Processes as a test lists them. Signal 9 ends a process that is there, unless it is `unkillable`;
// other signals change nothing.
class InMemoryProcessTable : public ProcessTable, public FakeService {
 public:
  std::vector<Process> processes;
  std::set<pid_t> unkillable;
  pid_t ownIdentifier = 4242;

  Sized sizeOfTable() override;
  Filled fillTable(std::size_t capacity) override;
  pid_t ownProcessIdentifier() override;
  Status sendSignal(pid_t process, int signal) override;
};

}  // namespace platform
