#include "platform/ClassRegistry.h"

#include <map>
#include <mutex>
#include <utility>

namespace platform {
namespace {

struct Registry {
  std::mutex mutex;
  std::map<std::string, RuntimeClass*, std::less<>> classes;
};

// Made at the first use, because bundles register while they are loaded, and never destroyed,
// because classes may be asked for until the process ends.
Registry& registry() {
  static Registry& made = *new Registry;
  return made;
}

}  // namespace

void registerClass(RuntimeClass& registered) {
  // Asked before the lock is taken: it is the bundle's code, which may use the registry itself.
  std::string name = registered.className();
  const std::lock_guard lock(registry().mutex);
  registry().classes.emplace(std::move(name), &registered);
}

RuntimeClass* registeredClass(std::string_view name) {
  const std::lock_guard lock(registry().mutex);
  const auto found = registry().classes.find(name);
  return found == registry().classes.end() ? nullptr : found->second;
}

}  // namespace platform
