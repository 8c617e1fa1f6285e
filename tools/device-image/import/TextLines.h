#pragma once

#include <cstddef>
#include <optional>
#include <string_view>

#include "tools/common/Text.h"

namespace tools {

// One line of a text. `text` leaves out the line end (LF or CR LF); `begin` and `end` are the
// offsets of the whole line, its line end included.
struct TextLine {
  std::string_view text;
  std::size_t begin = 0;
  std::size_t end = 0;
  std::size_t number = 0;  // from 1
};

// Walks the lines of a text, which outlives it.
class TextLines {
 public:
  explicit TextLines(std::string_view bytes) : _bytes(bytes) {}
  // The next line; empty at the end. A last line without a line end counts.
  std::optional<TextLine> next();
  // The byte that the next line begins with; empty at the end.
  std::optional<char> peek() const;

 private:
  std::string_view _bytes;
  std::size_t _position = 0;
  std::size_t _number = 0;
};

// The byte order mark that some programs put before UTF-8.
inline constexpr std::string_view kByteOrderMark = "\xEF\xBB\xBF";

}  // namespace tools
