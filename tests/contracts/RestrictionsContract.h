#pragma once

#include "platform/RestrictionsService.h"
#include "tests/contracts/Port.h"

// One device without a configuration profile.
class RestrictionsUnderTest {
 public:
  virtual ~RestrictionsUnderTest() = default;
  virtual platform::RestrictionsService& service() = 0;
  virtual void setForbidden(platform::RestrictedFeature feature, bool forbidden) = 0;
};
using RestrictionsPort = Port<RestrictionsUnderTest>;

class RestrictionsContract : public Contract<RestrictionsUnderTest> {
 protected:
  static constexpr platform::RestrictedFeature kFeatures[] = {
      platform::RestrictedFeature::cloudDocumentSync, platform::RestrictedFeature::photoStream,
      platform::RestrictedFeature::sharedPhotoStreams, platform::RestrictedFeature::cloudBackup,
      platform::RestrictedFeature::cardsWhileLocked};
  bool isForbidden(platform::RestrictedFeature feature) {
    return device->service().featureRestriction(feature) ==
           platform::RestrictionsService::kExplicitlyForbidden;
  }
};

TEST_P(RestrictionsContract, ForbidsNothingWithoutAProfile) {
  for (const auto feature : kFeatures) EXPECT_FALSE(isForbidden(feature));
}

TEST_P(RestrictionsContract, ForbidsTheFeatureThatAProfileNamesAndNoOther) {
  for (const auto forbidden : kFeatures) {
    device->setForbidden(forbidden, true);
    for (const auto feature : kFeatures) EXPECT_EQ(isForbidden(feature), feature == forbidden);
    device->setForbidden(forbidden, false);
  }
}
