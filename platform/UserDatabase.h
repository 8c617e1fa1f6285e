#pragma once

#include <sys/types.h>

#include <optional>
#include <string>
#include <string_view>

#include "platform/Export.h"

namespace platform {

// The device's users and groups.
class PLATFORM_EXPORT UserDatabase {
 public:
  virtual ~UserDatabase();
  // The number of the user (group) named `name`; empty when there is none or the database cannot be
  // read. A name made of digits is a name like any other.
  virtual std::optional<uid_t> userIdentifierForName(std::string_view name) = 0;
  virtual std::optional<gid_t> groupIdentifierForName(std::string_view name) = 0;
  // The home directory of the user whose settings are migrated; an absolute path.
  virtual std::string homeDirectory() = 0;
};

}  // namespace platform
