// Terminal text: tables, and untrusted names.
#pragma once

#include <cstddef>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// Escapes control characters, including newlines, marks of writing direction and bytes that are not UTF-8 as \xNN. Text
// from a plug-in or a file must not control the user's terminal, nor look there like another text.
std::string printable(std::string_view text);

// Like printable(), but keeps tabs and newlines, for text of several lines.
std::string printableLines(std::string_view text);

// Like printable(), but each line of the text begins with `indent` and ends with a newline.
std::string indentedLines(std::string_view text, std::string_view indent);

// "1 event", "2 events": a count of something whose plural ends in s.
std::string countText(std::size_t number, std::string_view what);

// The printable() text in lines of at most 80 columns. The first line begins with `first`, the others with `rest`.
// Lines are broken at blanks, except inside `back quotes`, so that commands are not split. A word that does not fit
// makes its line longer.
std::string wrapped(std::string_view text, std::string_view first, std::string_view rest);

// The number of code points, which is the number of columns for most text.
std::size_t widthOf(std::string_view text);

// Cells in aligned columns. Widths count code points.
// Thread: one at a time.
class Table {
 public:
  enum class Align { kLeft, kRight };

  // One alignment per column.
  explicit Table(std::vector<Align> columns) : columns_(std::move(columns)) {}

  // Takes one cell per column. `before` and `after` surround the last cell and count as zero columns: they set its
  // colour.
  void addRow(std::vector<std::string> cells, std::string before = {}, std::string after = {});

  // Prints one line per row, each beginning with `indent` and without trailing blanks.
  void print(std::ostream& out, std::string_view indent) const;

 private:
  struct Row {
    std::vector<std::string> cells;
    std::string before;
    std::string after;
  };

  std::vector<Align> columns_;
  std::vector<Row> rows_;
};

}  // namespace quazor
