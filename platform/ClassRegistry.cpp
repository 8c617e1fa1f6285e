#include "platform/ClassRegistry.h"

#include <map>
#include <mutex>
#include <utility>

namespace platform {
namespace {

struct Registry {
  std::mutex mutex;
  // Of one name the first is answered. The others are kept too: whoever made them may have no
  // other place that holds them.
  std::multimap<std::string, RuntimeClass*, std::less<>> classes;
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
  const auto& classes = registry().classes;
  const auto found = classes.lower_bound(name);
  return found == classes.end() || found->first != name ? nullptr : found->second;
}

}  // namespace platform
