#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "propertylist/Export.h"
#include "propertylist/Value.h"

namespace propertylist {

// The canonical binary form: equal values give equal bytes, and every string, key and equal leaf is
// stored once. Empty when the form cannot hold the value or readPropertyList would refuse it: a
// string that is not UTF-8, a date that is no finite number, nesting or size above the reader's
// limits.
PROPERTYLIST_EXPORT std::optional<Bytes> writeBinaryPropertyList(const Value& value);

// The XML form, for people and tools. Empty as above, and also for a string with a character that
// XML cannot hold, a real that is "not a number" with bits of its own, and a date outside the years
// 1 to 9999. A date is written to the second: that form has no parts of one.
PROPERTYLIST_EXPORT std::optional<std::string> writeXMLPropertyList(const Value& value);

// A description for logs and people: a string bare, numbers in decimal, a boolean as 1 or 0, a date
// in ISO 8601 UTC, data as <hex>, an array as (a, b), a dictionary as {key = value; key = value}.
// One of more than `limit` bytes, or kMaximumDescription, is cut as by shortened; no more of it is
// made, whatever the value's size.
inline constexpr std::size_t kMaximumDescription = std::size_t{16} << 20U;
PROPERTYLIST_EXPORT std::string describe(const Value& value,
                                         std::size_t limit = kMaximumDescription);

// `text`; when it has more than `limit` bytes, as many characters as fit into them, then "...". No
// character of UTF-8 is split.
PROPERTYLIST_EXPORT std::string shortened(std::string_view text, std::size_t limit);

}  // namespace propertylist
