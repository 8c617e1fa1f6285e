#include "platform/testing/InMemoryFileLock.h"

#include <utility>

namespace platform {

class InMemoryFileLock::Lock : public HeldFileLock {
 public:
  Lock(std::shared_ptr<State> state, std::string name)
      : _state(std::move(state)), _name(std::move(name)) {}
  ~Lock() override { release(); }
  Lock(const Lock&) = delete;
  Lock& operator=(const Lock&) = delete;

  std::string_view name() const { return _name; }
  void release() {
    const std::lock_guard guard(_state->mutex);
    if (std::exchange(_released, true)) return;
    _state->held.erase(_name);
    _state->changed.notify_all();
  }

 private:
  std::shared_ptr<State> _state;
  std::string _name;
  bool _released = false;
};

HeldFileLockPtr InMemoryFileLock::lockByName(std::string_view name) {
  std::unique_lock guard(_state->mutex);
  if (_fails("lockByName", {name})) return nullptr;
  ++_state->waiting;
  _state->changed.wait(guard, [&] { return !_state->held.contains(name); });
  --_state->waiting;
  _state->held.emplace(name);
  return std::make_shared<Lock>(_state, std::string(name));
}

void InMemoryFileLock::unlock(const HeldFileLockPtr& lock) {
  Lock* held = dynamic_cast<Lock*>(lock.get());
  {
    const std::lock_guard guard(_state->mutex);
    if (_fails("unlock", {held == nullptr ? "none" : held->name()})) return;
  }
  if (held != nullptr) held->release();
}

bool InMemoryFileLock::isHeld(std::string_view name) const {
  const std::lock_guard guard(_state->mutex);
  return _state->held.contains(name);
}

int InMemoryFileLock::waiting() const {
  const std::lock_guard guard(_state->mutex);
  return _state->waiting;
}

}  // namespace platform
