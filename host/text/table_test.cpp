#include "host/text/table.h"

#include "base/text/hexadecimal.h"

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
  EXPECT_EQ(printable("\xC2\xA0"), "\xC2\xA0");
  EXPECT_EQ(printable("\xC3\x9B"), "\xC3\x9B");
}

TEST(Printable, ShowsEachByteThatIsNotUtf8) {
  EXPECT_EQ(printable("a\xFFz"), "a\\xffz");
  EXPECT_EQ(printable("\x9B"
                      "31m"),
            "\\x9b31m");
  EXPECT_EQ(printable("\xC2"), "\\xc2");
  EXPECT_EQ(printable("\xE2\x82\033[m\xE2\x82\xAC"), "\\xe2\\x82\\x1b[m\xE2\x82\xAC");
  EXPECT_EQ(printable("\xED\xA0\x80"), "\\xed\\xa0\\x80");
}

TEST(Printable, ShowsMarksThatChangeTheDirectionOfText) {
  const char* const marks[] = {"\u061C", "\u200E", "\u200F", "\u202A", "\u202B", "\u202C",
                               "\u202D", "\u202E", "\u2066", "\u2067", "\u2068", "\u2069"};
  for (const std::string mark : marks) {
    std::string escaped;
    for (const char unit : mark) escaped += "\\x" + hexadecimal({&unit, 1});
    EXPECT_EQ(printable("a" + mark + "b"), "a" + escaped + "b");
    EXPECT_EQ(printableLines(mark + "\n"), escaped + "\n");
  }
  // Their neighbours, and letters that are written from right to left, stay.
  for (const std::string text :
       {"\u061B", "\u061D", "\u200D", "\u2010", "\u2029", "\u202F", "\u2065", "\u206A", "\u05D0\u05D1", "\u0627"}) {
    EXPECT_EQ(printable(text), text);
  }
}

TEST(PrintableLines, KeepsTabsAndNewLinesAndNothingElseThatSteers) {
  EXPECT_EQ(printableLines("one\ttwo\nthree\r\n"), "one\ttwo\nthree\\x0d\n");
  EXPECT_EQ(printableLines("a\033[2Jb\a\x7F\xFF\xC2\x9B"), "a\\x1b[2Jb\\x07\\x7f\\xff\\x9b");
  EXPECT_EQ(printableLines(std::string_view("\0\n", 2)), "\\x00\n");
  EXPECT_EQ(printableLines("\xC3\xA9"), "\xC3\xA9");
}

TEST(IndentedLines, IndentsEachLine) {
  EXPECT_EQ(indentedLines("one", "  "), "  one\n");
  EXPECT_EQ(indentedLines("one\ntwo\x01", "> "), "> one\n> two\\x01\n");
  EXPECT_EQ(indentedLines("", "  "), "  \n");
}

TEST(Wrapped, BreaksLinesOfMoreThan80ColumnsAtBlanks) {
  const std::string forty(40, 'a');
  const std::string thirtyNine(39, 'b');
  const std::string quoted = "`" + std::string(30, 'c') + " " + std::string(30, 'd') + "`";
  struct Row {
    const char* name;
    std::string text;
    std::string lines;
  };
  const Row rows[] = {
      {"a short text", "one two", "- one two\n"},
      {"nothing", "", "- \n"},
      {"80 columns", "a" + forty.substr(3) + " " + thirtyNine, "- a" + forty.substr(3) + " " + thirtyNine + "\n"},
      {"81 columns", "a" + forty.substr(2) + " " + thirtyNine, "- a" + forty.substr(2) + "\n  " + thirtyNine + "\n"},
      {"code points, not bytes", forty.substr(3) + "\xC3\xA9 " + thirtyNine,
       "- " + forty.substr(3) + "\xC3\xA9 " + thirtyNine + "\n"},
      {"several blanks", "one  two ", "- one two\n"},
      {"a word that is too long", "one " + forty + forty + " two", "- one\n  " + forty + forty + "\n  two\n"},
      {"back quotes", "it is " + forty + " " + quoted + ".", "- it is " + forty + "\n  " + quoted + ".\n"},
      {"a back quote without an end", "one `two three", "- one `two three\n"},
      {"control characters", "one\ntwo", "- one\\x0atwo\n"},
  };
  for (const Row& row : rows) EXPECT_EQ(wrapped(row.text, "- ", "  "), row.lines) << row.name;
}

}  // namespace
}  // namespace quazor
