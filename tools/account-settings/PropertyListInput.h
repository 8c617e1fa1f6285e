#pragma once

#include <string>

#include "propertylist/Value.h"

namespace tools {

// The property list in the file, in the binary, the XML or the JSON form (JsonForm.h); the content
// tells which. Ends the command, naming the place, when it is none.
propertylist::Value readPropertyListOfAnyForm(const std::string& path);

}  // namespace tools
