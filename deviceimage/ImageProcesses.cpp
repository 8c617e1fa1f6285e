#include "deviceimage/ImageProcesses.h"

#include <unistd.h>

#include <cerrno>
#include <thread>

namespace deviceimage {

platform::ProcessTable::Sized ImageProcessTable::sizeOfTable() { return {}; }

platform::ProcessTable::Filled ImageProcessTable::fillTable(std::size_t /*capacity*/) { return {}; }

pid_t ImageProcessTable::ownProcessIdentifier() { return ::getpid(); }

platform::Status ImageProcessTable::sendSignal(pid_t process, int /*signal*/) {
  return platform::Status::failure(
      ESRCH, "a device image has no process with the number " + std::to_string(process));
}

void WaitingRunLoop::runForAtMost(std::chrono::milliseconds slice) {
  std::this_thread::sleep_for(slice);
}

}  // namespace deviceimage
