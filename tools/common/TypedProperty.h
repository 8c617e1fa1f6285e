#pragma once

#include <string>
#include <string_view>
#include <utility>

#include "propertylist/Value.h"

namespace tools {

// One "KEY=VALUE" of the command line. KEY may end in ":" and a kind: string (the default),
// integer, real, boolean (true or false), date (ISO 8601) or data (hexadecimal digits). Ends the
// command when it is none of these.
std::pair<std::string, propertylist::Value> typedProperty(const std::string& text);

}  // namespace tools
