#include "tools/common/Table.h"

#include <algorithm>
#include <utility>

#include "tools/common/Text.h"

namespace tools {
namespace {

// The characters of UTF-8 text, each counted as one column.
std::size_t widthOf(const std::string& text) {
  return static_cast<std::size_t>(std::count_if(text.begin(), text.end(), [](char c) {
    return (static_cast<unsigned char>(c) & 0xC0U) != 0x80;
  }));
}

}  // namespace

void Table::addRow(std::vector<std::string> cells) {
  for (std::string& cell : cells) cell = forTerminal(cell);
  _rows.push_back(std::move(cells));
}

std::string Table::text() const {
  std::vector<std::size_t> widths(_rows.front().size());
  for (const auto& row : _rows)
    for (std::size_t i = 0; i < row.size(); ++i) widths[i] = std::max(widths[i], widthOf(row[i]));
  std::string text;
  for (const auto& row : _rows) {
    std::string line;
    for (std::size_t i = 0; i < row.size(); ++i) {
      line += row[i];
      line.append(widths[i] - widthOf(row[i]) + 2, ' ');
    }
    line.erase(line.find_last_not_of(' ') + 1);
    text += line + '\n';
  }
  return text;
}

}  // namespace tools
