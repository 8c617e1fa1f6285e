#pragma once

#include <nlohmann/json.hpp>

#include "propertylist/Value.h"

// Values as JSON that keeps their kinds: {"dict": [[key, value], ...]}, {"array": [...]},
// {"string": "..."}, {"integer": "-5"}, {"real": "1.5"} (decimal or hexadecimal), {"boolean":
// true},
// {"date": "2001-01-01T00:00:00Z"} or {"date": "0x1p+3"} (seconds since 2001), {"data": base64}.
// Made without the code under test.
propertylist::Value valueFromJSON(const nlohmann::json& json);

// Reals and dates come out hexadecimal.
nlohmann::json jsonFromValue(const propertylist::Value& value);

std::string base64(const std::string& bytes);
std::string bytesOfBase64(const std::string& text);
