#pragma once

#include <string>
#include <vector>

namespace tools {

// Rows of texts, printed in aligned columns two blanks apart.
class Table {
 public:
  explicit Table(std::vector<std::string> heading) { addRow(std::move(heading)); }
  // As many cells as the heading has. Control characters are escaped (Text.h).
  void addRow(std::vector<std::string> cells);
  std::string text() const;

 private:
  std::vector<std::vector<std::string>> _rows;
};

}  // namespace tools
