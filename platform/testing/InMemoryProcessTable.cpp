#include "platform/testing/InMemoryProcessTable.h"

#include <algorithm>
#include <cerrno>
#include <csignal>

namespace platform {

ProcessTable::Sized InMemoryProcessTable::sizeOfTable() {
  Sized sized;
  sized.status = _answered("sizeOfTable", {}, [&] {
    sized.count = processes.size();
    return Status::success();
  });
  return sized;
}

ProcessTable::Filled InMemoryProcessTable::fillTable(std::size_t capacity) {
  Filled filled;
  filled.status = _answered("fillTable", {std::to_string(capacity)}, [&] {
    if (processes.size() > capacity) return Status::failure(ENOMEM, "the table has grown");
    filled.processes = processes;
    return Status::success();
  });
  return filled;
}

pid_t InMemoryProcessTable::ownProcessIdentifier() {
  _received("ownProcessIdentifier", {});
  return ownIdentifier;
}

Status InMemoryProcessTable::sendSignal(pid_t process, int signal) {
  return _answered("sendSignal", {std::to_string(process), std::to_string(signal)}, [&] {
    const auto found =
        std::find_if(processes.begin(), processes.end(),
                     [&](const Process& candidate) { return candidate.identifier == process; });
    if (found == processes.end()) return Status::failure(ESRCH, "no such process");
    if (signal == SIGKILL && !unkillable.contains(process)) processes.erase(found);
    return Status::success();
  });
}

}  // namespace platform
