#pragma once

#include <string>
#include <string_view>

#include "propertylist/Reading.h"
#include "propertylist/Value.h"

namespace tools {

// The JSON form of property lists, which keeps everything that the binary form holds:
//
//   dictionary, array, string, boolean   the same in JSON
//   integer   a number without "." and exponent, from -2^63 to 2^64 - 1
//   real      a number with "." or exponent; {"@real": "nan"}, "inf" or "-inf", and "nan:" with
//             sixteen hexadecimal digits for a "not a number" with bits of its own
//   date      {"@date": "2026-11-21T02:40:00.25Z"}, or {"@date": SECONDS} with the seconds since
//             2001-01-01T00:00:00Z where such a text cannot tell
//   data      {"@data": BASE64}
//
// A dictionary whose only key begins with "@" has one more "@" before it: {"@date": "x"} with a
// plain string in it is {"@@date": "x"}.

// UTF-8 with an indentation of two and a line end. The value's strings are UTF-8.
std::string jsonFormText(const propertylist::Value& value);

// The value of a text of this form. The limits are those of propertylist::readPropertyList; a
// number that does not fit, null, a key given twice and an unknown "@" key are errors, which say
// where: line and column, or the way to the value ("Accounts[3].Since").
propertylist::ReadResult readJsonForm(std::string_view text);

// What stands in `text` (no empty one): whether it begins as JSON does, not as the binary or the
// XML form.
bool looksLikeJson(std::string_view text);

}  // namespace tools
