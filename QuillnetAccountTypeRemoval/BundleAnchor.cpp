#include "QuillnetAccountTypeRemoval/BundleAnchor.h"

namespace accountsettings {

const void* bundleAnchor() {
  static const char anchor = 0;
  return &anchor;
}

}  // namespace accountsettings
