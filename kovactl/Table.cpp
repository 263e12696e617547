#include "kovactl/Table.h"

#include <algorithm>
#include <ostream>
#include <utility>

#include "tessa/text/Escape.h"
#include "tessa/text/Utf8.h"

namespace Kovactl {
namespace {

std::string Trimmed(std::string line) {
  line.erase(line.find_last_not_of(' ') + 1);
  return line;
}

}  // namespace

Table::Table(std::vector<Column> columns) : _columns(std::move(columns)) {}

void Table::AddRow(const std::vector<std::string>& cells) {
  std::vector<std::string>& row = _rows.emplace_back();
  for (const std::string& cell : cells) {
    row.push_back(Tessa::Escape(cell));
  }
  row.resize(_columns.size());
}

void Table::Print(std::ostream& out) const {
  std::vector<std::size_t> widths(_columns.size(), 0);
  for (const std::vector<std::string>& row : _rows) {
    for (std::size_t i = 0; i < row.size(); ++i) {
      widths[i] = std::max(widths[i], Tessa::CountCharacters(row[i]));
    }
  }
  const auto printLine = [&](const auto& cellOf) {
    std::string line;
    for (std::size_t i = 0; i < _columns.size(); ++i) {
      if (widths[i] == 0) {
        continue;
      }
      const std::string& cell = cellOf(i);
      const std::string padding(
          std::max(widths[i], Tessa::CountCharacters(_columns[i].title)) - Tessa::CountCharacters(cell), ' ');
      line += line.empty() ? "" : "  ";
      line += _columns[i].align == Align::Right ? padding + cell : cell + padding;
    }
    out << Trimmed(line) << "\n";
  };
  printLine([&](std::size_t i) -> const std::string& { return _columns[i].title; });
  for (const std::vector<std::string>& row : _rows) {
    printLine([&](std::size_t i) -> const std::string& { return row[i]; });
  }
}

}  // namespace Kovactl
