#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace tools {

// " (did you mean "Q1"?)" with up to three of the names that resemble `wanted`; empty when none
// does.
std::string suggestion(std::string_view wanted, const std::vector<std::string>& names);

}  // namespace tools
