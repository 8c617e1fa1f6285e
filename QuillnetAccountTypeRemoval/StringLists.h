#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "propertylist/Value.h"

namespace accountsettings {

// An ordered list of strings: dataclasses, types, user actions.
using StringList = std::vector<std::string>;

// The strings of an array value, in order, other members left out; empty when `value` is null or no
// array.
std::optional<StringList> stringsOfArray(const propertylist::Value* value);

propertylist::Array arrayOfStrings(const StringList& strings);

bool contains(const StringList& strings, std::string_view wanted);

}  // namespace accountsettings
