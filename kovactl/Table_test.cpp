#include "kovactl/Table.h"

#include <gtest/gtest.h>

#include <sstream>

namespace Kovactl {
namespace {

using Align = Table::Align;

std::string Printed(const Table& table) {
  std::ostringstream out;
  table.Print(out);
  return out.str();
}

TEST(Table, ColumnsAreAsWideAsTheirWidestCell) {
  Table table({{"DISK"}, {"SIZE", Align::Right}, {"STATE"}});
  table.AddRow({"naa.1", "1.0 GiB", "eligible"});
  table.AddRow({"a", "512 B", "in use"});
  EXPECT_EQ(Printed(table),
            "DISK      SIZE  STATE\n"
            "naa.1  1.0 GiB  eligible\n"
            "a        512 B  in use\n");
}

TEST(Table, ATitleMayBeTheWidestCell) {
  Table table({{"LONG TITLE"}, {"N", Align::Right}});
  table.AddRow({"a", "1"});
  EXPECT_EQ(Printed(table), "LONG TITLE  N\na           1\n");
}

TEST(Table, ColumnsThatAreEmptyInEveryRowAreLeftOut) {
  Table table({{"A"}, {"NEVER"}, {"B"}});
  table.AddRow({"1", "", "2"});
  table.AddRow({"3", "", ""});
  EXPECT_EQ(Printed(table), "A  B\n1  2\n3\n");
}

TEST(Table, AnEmptyFirstCellKeepsTheOthersInTheirPlace) {
  Table table({{"A"}, {"B"}});
  table.AddRow({"", "2"});
  table.AddRow({"1", "2"});
  EXPECT_EQ(Printed(table), "A  B\n   2\n1  2\n");
}

TEST(Table, MissingCellsAreEmptyAndSurplusOnesAreDropped) {
  Table table({{"A"}, {"B"}});
  table.AddRow({"1"});
  table.AddRow({"2", "3", "4"});
  EXPECT_EQ(Printed(table), "A  B\n1\n2  3\n");
}

TEST(Table, CountsCharactersNotBytes) {
  Table table({{"A"}, {"B"}});
  table.AddRow({"Größe", "x"});
  table.AddRow({"12345", "y"});
  EXPECT_EQ(Printed(table), "A      B\nGröße  x\n12345  y\n");
}

TEST(Table, MakesControlCharactersVisible) {
  Table table({{"A"}, {"B"}});
  table.AddRow({"a\nb\x1b[2J", "x"});
  EXPECT_EQ(Printed(table), "A              B\na\\x0ab\\x1b[2J  x\n");
}

}  // namespace
}  // namespace Kovactl
