#pragma once

#include <cstdint>

#include "propertylist/Value.h"

namespace propertylist {

// How many values `value` stands for, itself included, when everything that it shares is counted at
// each place; but never more than `limit` and 1. What is shared is looked at once.
std::uint64_t countValues(const Value& value, std::uint64_t limit);

}  // namespace propertylist
