#pragma once

#include <string_view>

namespace platform {

// Whether `name` names an entry of the directory it is joined to, and nothing else.
inline bool isPlainFileName(std::string_view name) {
  return !name.empty() && name != "." && name != ".." && name.find('/') == name.npos &&
         name.find('\0') == name.npos;
}

}  // namespace platform
