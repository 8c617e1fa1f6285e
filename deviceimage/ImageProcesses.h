#pragma once

#include "platform/ProcessTable.h"
#include "platform/RunLoop.h"

namespace deviceimage {

// The processes of an image: a directory runs none, so the table is empty and there is nobody to
// send a signal to. The machine's own processes are no business of an image.
class ImageProcessTable : public platform::ProcessTable {
 public:
  Sized sizeOfTable() override;
  Filled fillTable(std::size_t capacity) override;
  pid_t ownProcessIdentifier() override;
  platform::Status sendSignal(pid_t process, int signal) override;
};

// A run loop without sources: it waits for the whole slice.
class WaitingRunLoop : public platform::RunLoop {
 public:
  void runForAtMost(std::chrono::milliseconds slice) override;
};

}  // namespace deviceimage
