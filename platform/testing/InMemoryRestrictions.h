#pragma once

#include <map>

#include "platform/RestrictionsService.h"
#include "platform/testing/FakeService.h"

namespace platform {

// Restriction states as a test sets them; 0 (allowed) for the others.
class InMemoryRestrictions : public RestrictionsService, public FakeService {
 public:
  std::map<RestrictedFeature, int> states;

  void forbid(RestrictedFeature feature) { states[feature] = kExplicitlyForbidden; }

  int featureRestriction(RestrictedFeature feature) override {
    if (_fails("featureRestriction", {_name(feature)})) return 0;
    const auto found = states.find(feature);
    return found == states.end() ? 0 : found->second;
  }

 private:
  static std::string_view _name(RestrictedFeature feature) {
    switch (feature) {
      case RestrictedFeature::cloudDocumentSync:
        return "cloudDocumentSync";
      case RestrictedFeature::photoStream:
        return "photoStream";
      case RestrictedFeature::sharedPhotoStreams:
        return "sharedPhotoStreams";
      case RestrictedFeature::cloudBackup:
        return "cloudBackup";
      case RestrictedFeature::cardsWhileLocked:
        break;
    }
    return "cardsWhileLocked";
  }
};

}  // namespace platform
