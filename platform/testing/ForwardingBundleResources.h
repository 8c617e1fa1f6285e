#pragma once

#include "platform/BundleResources.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingBundleResources : public BundleResources {
 public:
  explicit ForwardingBundleResources(BundleResources& next) : _next(next) {}

  std::optional<std::string> pathForResource(const void* code, std::string_view name,
                                             std::string_view type) override {
    return _next.pathForResource(code, name, type);
  }
  std::string localizedString(const void* code, std::string_view key,
                              std::string_view table) override {
    return _next.localizedString(code, key, table);
  }

 private:
  BundleResources& _next;
};

}  // namespace platform
