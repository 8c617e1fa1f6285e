#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "propertylist/Value.h"

namespace tools {

// The instant as YYYY-MM-DDThh:mm:ss[.fraction]Z with as many digits as tell it from every other
// date. Empty outside the years 1 to 9999, and for the few dates that such a text cannot tell from
// another ("minus zero").
std::optional<std::string> exactDateText(propertylist::Date date);

// The instant of a text of that form; empty for any other text and for a day or time that does not
// exist.
std::optional<propertylist::Date> parseExactDateText(std::string_view text);

}  // namespace tools
