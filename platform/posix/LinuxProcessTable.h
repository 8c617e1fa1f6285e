#pragma once

#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <utility>

#include "platform/ProcessTable.h"

namespace platform {

// The processes of a Linux machine, from /proc, in the order of their identifiers. Any thread.
//
// A process's command name is the file name of its executable, or of its first argument where the
// executable is not shown to the caller, or the kernel's own short name where there is neither; cut
// at 16 bytes. A process of which every thread has ended, and which waits for its parent, is none.
class PLATFORM_EXPORT LinuxProcessTable : public ProcessTable {
 public:
  // All processes, or only those whose executable is a file below `directory` (absolute, without
  // links and without a "/" at its end unless it is "/"). A process whose executable is not shown
  // to the caller, such as another user's, is then none of them.
  LinuxProcessTable() = default;
  explicit LinuxProcessTable(std::string directory) : _directory(std::move(directory)) {}

  // Some more than there are, since the table grows meanwhile.
  Sized sizeOfTable() override;
  // Fails with ENOMEM when the table has grown past `capacity`.
  Filled fillTable(std::size_t capacity) override;
  pid_t ownProcessIdentifier() override;
  // Signals the process that had the identifier when the table was last filled. One that has taken
  // the number since then is not hit, nor is one that was not listed (ESRCH). Two
  // threads that look up and signal have a table each, or the one's listing counts for the other.
  Status sendSignal(pid_t process, int signal) override;

 private:
  std::string _directory;
  std::mutex _mutex;
  std::map<pid_t, std::uint64_t> _startTimes;  // of the processes that were listed last
};

}  // namespace platform
