#pragma once

#include <string>
#include <string_view>

namespace tools {

// Whether the bytes are UTF-8: no overlong form, no surrogate, nothing above U+10FFFF, and no NUL,
// which no text holds.
bool isText(std::string_view bytes);

// The text as a terminal may have it, on one line: control characters (those from U+0080 on too),
// bytes that are no UTF-8, and characters that turn the direction of writing around, are escaped as
// "\x1b" and "\u202e".
std::string forTerminal(std::string_view text);

// Without blanks, tabs and line ends on both sides.
std::string_view trimmed(std::string_view text);

// ASCII letters only; other bytes stay.
std::string upperCased(std::string_view text);
bool equalsIgnoringCase(std::string_view a, std::string_view b);

}  // namespace tools
