#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "propertylist/Value.h"

namespace propertylist {

// The instant as YYYY-MM-DDThh:mm:ssZ, a part of a second left out. Empty outside the years 1 to
// 9999.
std::optional<std::string> dateText(Date date);

// The instant of a text of exactly that form; empty for any other text and for a day or time that
// does not exist.
std::optional<Date> parseDateText(std::string_view text);

}  // namespace propertylist
