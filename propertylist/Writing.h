#pragma once

#include <optional>
#include <string>

#include "propertylist/Export.h"
#include "propertylist/Value.h"

namespace propertylist {

// The canonical binary form: equal values give equal bytes, and every string, key and equal leaf is
// stored once. Empty when the form cannot hold the value or readPropertyList would refuse it: a string
// that is not UTF-8, a date that is no number, nesting or size above the reader's limits.
PROPERTYLIST_EXPORT std::optional<Bytes> writeBinaryPropertyList(const Value& value);

// The XML form, for people and tools. Empty as above, and also for a string with a character that XML
// cannot hold, and a date outside the years 1 to 9999.
PROPERTYLIST_EXPORT std::optional<std::string> writeXMLPropertyList(const Value& value);

// A description for logs and people: a string bare, numbers in decimal, a boolean as 1 or 0, a date in
// ISO 8601 UTC, data as <hex>, an array as (a, b), a dictionary as {key = value; ...}.
PROPERTYLIST_EXPORT std::string describe(const Value& value);

}  // namespace propertylist
