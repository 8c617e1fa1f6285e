#include "platform/testing/InMemoryClassRegistry.h"

#include <utility>

namespace platform {
namespace {

class LoadedBundle : public CodeBundle {
 public:
  explicit LoadedBundle(std::optional<std::string> principal) : _principal(std::move(principal)) {}
  std::optional<std::string> principalClassName() const override { return _principal; }

 private:
  std::optional<std::string> _principal;
};

}  // namespace

RuntimeClass* InMemoryClassRegistry::classNamed(std::string_view name) {
  if (_fails("classNamed", {name})) return nullptr;
  const auto found = classes.find(name);
  return found == classes.end() ? registeredClass(name) : found->second;
}

CodeBundlePtr InMemoryClassRegistry::loadCodeBundle(const std::string& path) {
  const auto found = bundles.find(path);
  if (_fails("loadCodeBundle", {path}) || found == bundles.end()) return nullptr;
  _register(found->second);
  return std::make_shared<LoadedBundle>(found->second.principalClassName);
}

std::optional<std::string> InMemoryClassRegistry::loadLibrary(const std::string& path) {
  if (const auto answer = _received("loadLibrary", {path}))
    return answer->status.error ? answer->status.error->description : "cannot be loaded";
  const auto found = libraries.find(path);
  if (found == libraries.end()) return path + ": no such library";
  _register(found->second);
  return std::nullopt;
}

void InMemoryClassRegistry::_register(const Code& code) {
  for (RuntimeClass* offered : code.classes) classes.emplace(offered->className(), offered);
}

}  // namespace platform
