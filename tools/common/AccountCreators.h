#pragma once

#include <set>
#include <string>

namespace tools {

// The code bundles that the installed catalogue of account creators names, as it names them: paths
// below an image's root. Ends the command, before anything is written, when it cannot be read.
std::set<std::string> namedBundles();

}  // namespace tools
