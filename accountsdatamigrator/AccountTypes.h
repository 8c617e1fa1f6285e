#pragma once

#include <optional>
#include <string_view>

#include "propertylist/Value.h"

namespace accountsdatamigrator {

// The catalogue of account types: the one beside this code, or the calling program's own where it
// names a folder of resources. An account of any other type would be
// gone at the account settings library's next save.
class AccountTypes {
 public:
  // Empty, after a line in the system log, when the catalogue cannot be read.
  static std::optional<AccountTypes> read();

  bool knows(std::string_view type) const { return _catalogue.contains(type); }
  // The dataclasses that an account of the type can have; none for an unknown type.
  propertylist::Array dataclassesOf(std::string_view type) const;

 private:
  explicit AccountTypes(propertylist::Dictionary catalogue) : _catalogue(std::move(catalogue)) {}

  propertylist::Dictionary _catalogue;
};

}  // namespace accountsdatamigrator
