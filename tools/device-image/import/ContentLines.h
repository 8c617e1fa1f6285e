#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "tools/device-image/import/TextLines.h"

namespace tools {

// One property line of a vCard or iCalendar text, its folds undone: "group.NAME;parameters:value".
struct ContentLine {
  std::string name;        // upper case, without the group; empty when the line is no property line
  std::string parameters;  // what stands between the first ";" and the ":", as it is
  std::string value;       // as it is, its blanks trimmed at both ends
  bool isBlank = false;
  bool isText = false;  // whether the unfolded line is UTF-8; a fold may lie inside a character
  // Offsets of the raw line, its folds and line end included, a byte order mark before it not.
  std::size_t begin = 0;
  std::size_t end = 0;
  std::size_t number = 0;  // of the first of its lines, from 1

  // Whether this is the line NAME:VALUE, in any case of letters.
  bool is(std::string_view propertyName, std::string_view propertyValue) const;
  // The value of a parameter, without quotation marks; empty when there is none of that name.
  std::optional<std::string> parameter(std::string_view parameterName) const;
};

// The text with a line end at its end, of the kind that its first line has: where a file was cut
// off or joined must not make another record of it.
std::string withLineEnd(std::string_view text);

// Walks the property lines of a text, which outlives it.
class ContentLines {
 public:
  explicit ContentLines(std::string_view bytes) : _lines(bytes) {}
  std::optional<ContentLine> next();

 private:
  TextLines _lines;
};

}  // namespace tools
