#include "tools/device-image/import/TextLines.h"

namespace tools {

std::optional<TextLine> TextLines::next() {
  if (_position == _bytes.size()) return std::nullopt;
  TextLine line;
  line.begin = _position;
  line.number = ++_number;
  const std::size_t lineFeed = _bytes.find('\n', _position);
  line.end = lineFeed == std::string_view::npos ? _bytes.size() : lineFeed + 1;
  std::size_t textEnd = lineFeed == std::string_view::npos ? _bytes.size() : lineFeed;
  if (lineFeed != std::string_view::npos && textEnd > line.begin && _bytes[textEnd - 1] == '\r')
    --textEnd;
  line.text = _bytes.substr(line.begin, textEnd - line.begin);
  _position = line.end;
  return line;
}

std::optional<char> TextLines::peek() const {
  if (_position == _bytes.size()) return std::nullopt;
  return _bytes[_position];
}

}  // namespace tools
