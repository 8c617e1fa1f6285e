#pragma once

#include <string>

namespace tools {

// The identifier of the dataclass that the command line names: "contacts" and its like, or a whole
// identifier. Ends the command when it is neither.
std::string dataclassIdentifierOf(const std::string& name);

// "contacts" and its like; the identifier itself for a dataclass that the image keeps no records
// of.
std::string shownDataclass(const std::string& identifier);

}  // namespace tools
