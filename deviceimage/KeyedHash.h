#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "propertylist/TextTable.h"

namespace deviceimage {

// The hash for tables of what comes from files: with the standard library's, which everybody knows,
// whoever writes a file could choose contents that collide.
struct KeyedHash {
  std::size_t operator()(std::string_view text) const {
    return propertylist::TextTable::hashOf(text);
  }
  std::size_t operator()(std::int64_t number) const {
    return propertylist::TextTable::hashOf(static_cast<std::uint64_t>(number), 0);
  }
};

}  // namespace deviceimage
