// Aligned columns for people.
#pragma once

#include <iosfwd>
#include <string>
#include <vector>

namespace Kovactl {

class Table {
 public:
  enum class Align { Left, Right };
  struct Column {
    std::string title;
    Align align = Align::Left;
  };

  explicit Table(std::vector<Column> columns);

  // One cell per column. Control characters are made visible, so that no name can play with the terminal.
  void AddRow(const std::vector<std::string>& cells);

  // Columns as wide as their widest cell, two blanks between them, none at the end of a line. Columns that
  // are empty in every row are left out.
  void Print(std::ostream& out) const;

 private:
  std::vector<Column> _columns;
  std::vector<std::vector<std::string>> _rows;
};

}  // namespace Kovactl
