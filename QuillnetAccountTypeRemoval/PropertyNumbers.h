#pragma once

#include <cstdint>

#include "propertylist/Value.h"

namespace accountsettings {

// A property taken as an integer: an integer as it is (the nearest one when it does not fit), a
// boolean as 1 or 0, a real truncated towards zero, a string by its leading blanks, sign and
// digits. Anything else, and null, is 0. So the string "1" is 1 and the string "abc" is 0.
std::int64_t integerValue(const propertylist::Value* value);

// A property taken as a truth value: a number is true when it is not 0; a string when, after
// blanks, a sign and zeros, it begins with Y, y, T, t or a digit from 1 to 9. Anything else, and
// null, is false.
bool booleanValue(const propertylist::Value* value);

}  // namespace accountsettings
