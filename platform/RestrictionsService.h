#pragma once

#include "platform/Export.h"

namespace platform {

// The features that a configuration profile can forbid.
enum class RestrictedFeature {
  cloudDocumentSync,
  photoStream,
  sharedPhotoStreams,
  cloudBackup,
  cardsWhileLocked
};

// What configuration profiles say about single features.
class PLATFORM_EXPORT RestrictionsService {
 public:
  static constexpr int kExplicitlyForbidden = 2;

  virtual ~RestrictionsService();
  // The feature's state now: kExplicitlyForbidden when a profile forbids it; any other number
  // allows.
  virtual int featureRestriction(RestrictedFeature feature) = 0;
};

}  // namespace platform
