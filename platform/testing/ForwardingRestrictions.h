#pragma once

#include "platform/RestrictionsService.h"

namespace platform {

// Hands every operation on to `next`, which outlives it. A test overrides the one it is about.
class ForwardingRestrictions : public RestrictionsService {
 public:
  explicit ForwardingRestrictions(RestrictionsService& next) : _next(next) {}

  int featureRestriction(RestrictedFeature feature) override {
    return _next.featureRestriction(feature);
  }

 private:
  RestrictionsService& _next;
};

}  // namespace platform
