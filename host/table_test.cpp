#include "host/table.h"

#include <gtest/gtest.h>

#include <sstream>

namespace quazor {
namespace {

using Align = Table::Align;

std::string printed(const Table& table, std::string_view indent = "") {
  std::ostringstream out;
  table.print(out, indent);
  return out.str();
}

TEST(Table, AlignsItsColumns) {
  Table table({Align::kLeft, Align::kRight, Align::kLeft});
  table.addRow({"Name", "Value", "Unit"});
  table.addRow({"x", "7", "frames"});
  table.addRow({"a long name", "123456", "e"});
  EXPECT_EQ(printed(table, "  "),
            "  Name          Value  Unit\n"
            "  x                 7  frames\n"
            "  a long name  123456  e\n");
}

TEST(Table, CountsCodePointsNotBytes) {
  Table table({Align::kLeft, Align::kLeft});
  table.addRow({"\xC3\xA9t\xC3\xA9", "b"});
  table.addRow({"abcd", "b"});
  EXPECT_EQ(printed(table), "\xC3\xA9t\xC3\xA9   b\nabcd  b\n");
}

TEST(Table, GivesColourNoWidth) {
  Table table({Align::kLeft, Align::kRight});
  table.addRow({"a", "1"}, "<", ">");
  table.addRow({"b", "100"});
  EXPECT_EQ(printed(table), "a    <1>\nb  100\n");
}

TEST(Printable, ShowsControlCharacters) {
  EXPECT_EQ(printable("plain text, \xC3\xA9"), "plain text, \xC3\xA9");
  EXPECT_EQ(printable("a\033[31mb\n\t\x7F"), "a\\x1b[31mb\\x0a\\x09\\x7f");
  EXPECT_EQ(printable(std::string_view("\0", 1)), "\\x00");
  EXPECT_EQ(printable("\xC2\x9B"
                      "31m"),
            "\\x9b31m");
  EXPECT_EQ(printable("\xC2\xA0\xC2"), "\xC2\xA0\xC2");
}

TEST(IndentedLines, IndentsEachLine) {
  EXPECT_EQ(indentedLines("one", "  "), "  one\n");
  EXPECT_EQ(indentedLines("one\ntwo\x01", "> "), "> one\n> two\\x01\n");
  EXPECT_EQ(indentedLines("", "  "), "  \n");
}

}  // namespace
}  // namespace quazor
