#pragma once

#include <string>

#include "platform/testing/TemporaryDirectory.h"
#include "propertylist/Value.h"

// A code bundle on the disk: the module built from SampleBundleCode.cpp, which registers
// "BundleClass", and an Info.plist beside it.
class SampleBundle {
 public:
  SampleBundle();
  explicit SampleBundle(const propertylist::Dictionary& information);

  // What a good Info.plist holds.
  static propertylist::Dictionary goodInformation();

  const std::string& path() const { return _directory.path(); }
  // Loads the code into the process; an address inside it.
  const void* load() const;

 private:
  platform::TemporaryDirectory _directory;
};
