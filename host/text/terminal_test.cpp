#include "host/text/terminal.h"

#include "host/text/display_width.h"
#include "host/text/table.h"

#include <gtest/gtest.h>

#include <sstream>

namespace quazor {
namespace {

TEST(FoldedLine, BreaksWhereTheTextAllows) {
  struct Row {
    const char* name;
    std::string line;
    std::size_t columns;
    std::string folded;
  };
  const Row rows[] = {
      {"a line that fits", "  as it is  ", 12, "  as it is  "},
      {"nothing", "", 10, ""},
      {"a sentence", "one two three four five six", 20, "one two three four\n  five six"},
      {"an indented text", "    one two three four five six", 24, "    one two three four\n    five six"},
      {"below the last column with room", "ok  name  one two three four five six", 28,
       "ok  name  one two three four\n          five six"},
      {"between columns", "PASS  CameraSyncDiagnostic.Back  9 results, 2 with limits", 40,
       "PASS  CameraSyncDiagnostic.Back\n      9 results, 2 with limits"},
      {"a column without room", "  --option-of-some-length  what it does", 30,
       "  --option-of-some-length\n      what it does"},
      {"a long word", std::string(25, 'x') + " y", 20, std::string(20, 'x') + "\n  " + std::string(5, 'x') + " y"},
      {"a path", "/a/path/of/some/length/file.so", 20, "/a/path/of/some/\n  length/file.so"},
      {"wide characters", "\u6D4B\u8BD5\u6D4B\u8BD5 \u6D4B\u8BD5", 10, "\u6D4B\u8BD5\u6D4B\u8BD5\n\u6D4B\u8BD5"},
      {"colours", "\033[31mFAIL\033[0m one two three four", 20, "\033[31mFAIL\033[0m one two three\n  four"},
      {"a tab", "a\tb c d e f g h i j k l m", 20, "a\n    b c d e f g h i\n    j k l m"},
  };
  for (const Row& row : rows) EXPECT_EQ(foldedLine(row.line, row.columns), row.folded) << row.name;
}

TEST(FoldedLine, IsNeverWiderAndLosesNothing) {
  const std::string lines[] = {
      "PASS  CameraSyncDiagnostic.Back  9 results, 2 with limits",
      "    - a cause that is \u6D4B\u8BD5 and /a/path/that/is/long/enough/to/be/broken.so, e\u0301t c\u0301",
      "quazor: " + std::string(200, 'q'),
      "a  b  c  d  e  f  g  h",
      "          \033[31m" + std::string(30, '\xFF') + "\033[0m",
  };
  const auto withoutBlanks = [](std::string text) {
    std::erase_if(text, [](char unit) { return unit == ' ' || unit == '\n'; });
    return text;
  };
  for (const std::string& line : lines) {
    for (std::size_t columns = 2; columns < 90; ++columns) {
      const std::string folded = foldedLine(line, columns);
      EXPECT_EQ(withoutBlanks(folded), withoutBlanks(line)) << columns;
      std::istringstream stream(folded);
      for (std::string one; std::getline(stream, one);) EXPECT_LE(widthOf(one), columns) << one;
    }
  }
}

TEST(AsciiText, ReplacesSymbolsAndEscapesTheRest) {
  EXPECT_EQ(asciiText("plain \033[31m"), "plain \033[31m");
  EXPECT_EQ(asciiText("20 \u00B0C \u00B1 1 \u00B5s \u2026"), "20 degC +- 1 us ...");
  EXPECT_EQ(asciiText("\u6D4B\xFF"), "\\xe6\\xb5\\x8b\\xff");
}

TEST(TerminalBuffer, FoldsCompleteLinesAndPassesOthersOn) {
  std::stringbuf target;
  std::ostream owner(nullptr);
  setColumns(owner, 10);
  {
    TerminalBuffer buffer(&target, owner, false);
    std::ostream out(&buffer);
    out << "one two "
        << "three\n";
    EXPECT_EQ(target.str(), "one two\nthree\n");
    out << "20 \u00B0C, flushed\r" << std::flush;
    EXPECT_EQ(target.str(), "one two\nthree\n20 degC, flushed\r");
    out << "rest";
    EXPECT_TRUE(buffer.passUnchanged("{\"json\": \"\u00E9\"}\n"));
    out << "end";
  }
  EXPECT_EQ(target.str(), "one two\nthree\n20 degC, flushed\rrest{\"json\": \"\u00E9\"}\nend");
}

TEST(TerminalBuffer, TellsThatTheTerminalIsGone) {
  class Broken : public std::streambuf {};
  Broken target;
  std::ostream owner(nullptr);
  TerminalBuffer buffer(&target, owner, true);
  std::ostream out(&buffer);
  out << "one\n";
  EXPECT_FALSE(out);
}

TEST(Columns, AreUnlimitedUnlessSet) {
  std::ostringstream out;
  EXPECT_EQ(columnsOf(out), kUnlimitedColumns);
  std::ostringstream other;
  setColumns(other, 40);
  prepareFor(other, out);
  EXPECT_EQ(columnsOf(out), 40U);
  EXPECT_FALSE(showsOnlyAscii(out));
}

TEST(Columns, AreUsualOnATerminalThatDoesNotTell) {
  std::stringbuf target;
  TerminalStream stream(&target, 1 << 20, false);  // no descriptor has this number
  EXPECT_EQ(columnsOf(stream), 80U);
  EXPECT_TRUE(showsOnlyAscii(stream));
  stream << std::string(81, 'a') << '\n';
  writeUnfolded(stream, std::string(81, 'b') + "\n");
  EXPECT_EQ(target.str(), std::string(80, 'a') + "\n  a\n" + std::string(81, 'b') + "\n");
}

class NarrowTable : public testing::Test {
 protected:
  NarrowTable() {
    table_.addHeader({"Result", "Value", "Limit"});
    table_.addRow({"Frames", "90", "every camera delivers 3 s of frames"}, "<", ">");
    table_.addRow({"Total", "7", "-"});
  }

  std::string printed(std::size_t columns) const {
    std::ostringstream out;
    setColumns(out, columns);
    table_.print(out, "  ");
    return out.str();
  }

  Table table_{{Table::Align::kLeft, Table::Align::kRight, Table::Align::kLeft}};
};

TEST_F(NarrowTable, FoldsCellsWithinTheirColumn) {
  EXPECT_EQ(printed(52),
            "  Result  Value  Limit\n"
            "  Frames     90  <every camera delivers 3 s of frames>\n"
            "  Total       7  -\n");
  EXPECT_EQ(printed(40),
            "  Result  Value  Limit\n"
            "  Frames     90  <every camera delivers 3>\n"
            "                 <s of frames>\n"
            "  Total       7  -\n");
}

TEST_F(NarrowTable, BecomesBlocksIfItMust) {
  EXPECT_EQ(printed(30),
            "  Frames\n"
            "    Value  90\n"
            "    Limit  <every camera delivers 3 s of frames>\n"
            "  Total\n"
            "    Value  7\n");
}

TEST(Table, CountsWideCharactersAndMarks) {
  Table table({Table::Align::kLeft, Table::Align::kLeft});
  table.addRow({"\u6D4B\u8BD5", "b"});
  table.addRow({"e\u0301", "b"});
  std::ostringstream out;
  table.print(out, "");
  EXPECT_EQ(out.str(), "\u6D4B\u8BD5  b\ne\u0301     b\n");
}

TEST(PrintWrapped, UsesTheColumnsOfTheStreamUpToTheUsualOnes) {
  const std::string text = "one two three four five six seven eight nine ten eleven twelve thirteen fourteen fifteen";
  for (const auto& [columns, longest] : {std::pair(20, 20), std::pair(200, 80)}) {
    std::ostringstream out;
    setColumns(out, static_cast<std::size_t>(columns));
    printWrapped(out, text, "- ", "  ");
    std::istringstream lines(out.str());
    for (std::string one; std::getline(lines, one);) EXPECT_LE(widthOf(one), static_cast<std::size_t>(longest));
    EXPECT_TRUE(out.str().starts_with("- one two three")) << out.str();
  }
}

}  // namespace
}  // namespace quazor
