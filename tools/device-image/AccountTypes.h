#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "propertylist/Value.h"

namespace tools {

// The class that accounts of the type have unless something else is said; empty for a type that the
// device does not know, whose accounts it would drop.
std::optional<std::string_view> defaultClassOfType(std::string_view type);

// The known types, for messages: "Quillnet, VantorAccount, ...".
std::string knownTypes();

// Why the device would drop a mail account (types "Mail" and "Quillnet") with these properties:
// neither its class nor its storage path says which mail engine serves it. Empty when all is well.
std::optional<std::string> mailClassProblem(const propertylist::Dictionary& account);

}  // namespace tools
