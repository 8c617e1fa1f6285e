#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "propertylist/Export.h"
#include "propertylist/Value.h"

// Leaves as texts, in the XML form and in descriptions. Blanks around a text that is read do not
// count.
namespace propertylist {

// Decimal, or hexadecimal after "0x", with an optional sign; empty when 64 bits cannot hold it.
struct IntegerText {
  std::uint64_t bits;
  bool isNegative;
};
std::optional<IntegerText> parseIntegerText(std::string_view text);
// In decimal.
std::string integerText(const Value& integer);

// Decimal, or "nan", "inf" or "infinity" in any case; empty when it is out of range.
std::optional<double> parseRealText(std::string_view text);
// The shortest decimal text that is read back equal.
std::string realText(double real);

// Base64 with its padding; blanks may stand anywhere.
PROPERTYLIST_EXPORT std::optional<Bytes> parseBase64(std::string_view text);
PROPERTYLIST_EXPORT std::string base64Text(const Bytes& data);

std::string_view withoutBlanks(std::string_view text);

}  // namespace propertylist
