#pragma once

#include "platform/ClassRegistry.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingClassRegistry : public ClassRegistry {
 public:
  explicit ForwardingClassRegistry(ClassRegistry& next) : _next(next) {}

  RuntimeClass* classNamed(std::string_view name) override { return _next.classNamed(name); }
  CodeBundlePtr loadCodeBundle(const std::string& path) override {
    return _next.loadCodeBundle(path);
  }
  std::optional<std::string> loadLibrary(const std::string& path) override {
    return _next.loadLibrary(path);
  }

 private:
  ClassRegistry& _next;
};

}  // namespace platform
