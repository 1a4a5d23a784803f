// Text for people: tables, and names that come from elsewhere.
#pragma once

#include <cstddef>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// The text with its control characters, new lines too, and each byte that is not UTF-8 shown as \xNN: what a plug-in or
// a file says must not steer the reader's terminal, nor break its text.
std::string printable(std::string_view text);

// As printable, but tabs and new lines stay: for text that may have several lines.
std::string printableLines(std::string_view text);

// As printable, but each line of the text begins with `indent` and ends with a new line.
std::string indentedLines(std::string_view text, std::string_view indent);

// "1 event", "2 events": a number of things whose plural ends with an s.
std::string countText(std::size_t number, std::string_view what);

// The text, as printable, in lines of at most 80 columns: the first one begins with `first`, the others with `rest`.
// Lines are broken at blanks, but not inside of `back quotes`: a command stays in one piece. What has no place to break
// it may be longer.
std::string wrapped(std::string_view text, std::string_view first, std::string_view rest);

// Cells in aligned columns. Widths count code points.
// Thread: one at a time.
class Table {
 public:
  enum class Align { kLeft, kRight };

  // One alignment per column.
  explicit Table(std::vector<Align> columns) : columns_(std::move(columns)) {}

  // As many cells as there are columns. `before` and `after` stand around the last cell and have no width: its colour.
  void addRow(std::vector<std::string> cells, std::string before = {}, std::string after = {});

  // One line per row, each beginning with `indent`; no blanks at the ends.
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
