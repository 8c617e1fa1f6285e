#pragma once

#include <string>
#include <string_view>
#include <utility>

#include "propertylist/Value.h"

namespace tools {

// What a value is typed as on the command line, by a kind: string, integer, real, boolean (true or
// false), date (ISO 8601) or data (hexadecimal digits). Ends the command when `text` is none of the
// kind, or there is no such kind; `shown` is what the message quotes.
propertylist::Value typedValue(std::string_view kind, std::string_view text,
                               std::string_view shown);

// "KEY" or "KEY:KIND", parted at the last colon; without a kind it is "string".
struct TypedKey {
  std::string key;
  std::string kind;
};
TypedKey typedKey(std::string_view text);

// One "KEY=VALUE" of the command line, with KEY as typedKey takes it. Ends the command when it is
// none.
std::pair<std::string, propertylist::Value> typedProperty(const std::string& text);

}  // namespace tools
