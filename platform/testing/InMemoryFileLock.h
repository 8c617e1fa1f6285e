#pragma once

#include <condition_variable>
#include <memory>
#include <mutex>
#include <set>
#include <string>

#include "platform/ExclusiveFileLock.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Named locks between the threads of one process. A lock object that is dropped is free, as that of
// a process that ended.
class InMemoryFileLock : public ExclusiveFileLock, public FakeService {
 public:
  HeldFileLockPtr lockByName(std::string_view name) override;
  void unlock(const HeldFileLockPtr& lock) override;

  bool isHeld(std::string_view name) const;
  // How many threads wait for a lock.
  int waiting() const;

 private:
  struct State {
    mutable std::mutex mutex;
    std::condition_variable changed;
    std::set<std::string, std::less<>> held;
    int waiting = 0;
  };
  class Lock;
  std::shared_ptr<State> _state = std::make_shared<State>();
};

}  // namespace platform
