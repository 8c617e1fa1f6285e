#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/Export.h"

namespace platform {

// The resources of code bundles: files that lie beside the code. A bundle is named by the address
// of anything in its code or data. Nothing here is ever written. Any thread.
class PLATFORM_EXPORT BundleResources {
 public:
  virtual ~BundleResources();
  // The path of the file `name`.`type` in the bundle that contains `code`; empty when the bundle
  // has no such file.
  virtual std::optional<std::string> pathForResource(const void* code, std::string_view name,
                                                     std::string_view type) = 0;
  // The text under `key` in the bundle's string table `table`, in the language that the user
  // prefers among those the bundle has, English otherwise. A missing key, table or language yields
  // `key` itself.
  virtual std::string localizedString(const void* code, std::string_view key,
                                      std::string_view table) = 0;
};

}  // namespace platform
