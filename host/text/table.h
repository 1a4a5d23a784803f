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

// Text is easier to read in lines of at most that many columns.
inline constexpr std::size_t kWidestText = 80;

// The printable() text in lines of at most `columns` columns. The first line begins with `first`, the others with
// `rest`. Lines are broken at blanks, except inside `back quotes`, so that commands are not split. A word that does not
// fit makes its line longer.
std::string wrapped(std::string_view text, std::string_view first, std::string_view rest,
                    std::size_t columns = kWidestText);

// Prints the wrapped() text with the columns of the stream, if these are fewer than usual.
void printWrapped(std::ostream& out, std::string_view text, std::string_view first, std::string_view rest);

// Cells in aligned columns. On a terminal that is too narrow, cells of several words are folded within their column; if
// that does not suffice, each row becomes a block: its first cell and, below it, a line for each of the others.
// Thread: one at a time.
class Table {
 public:
  enum class Align { kLeft, kRight };

  // One alignment per column.
  explicit Table(std::vector<Align> columns) : columns_(std::move(columns)) {}

  // Takes the names of the columns.
  void addHeader(std::vector<std::string> cells);

  // Takes one cell per column. `before` and `after` surround the last cell and count as zero columns: they set its
  // colour.
  void addRow(std::vector<std::string> cells, std::string before = {}, std::string after = {});

  // Prints one line per row if the columns of the stream suffice, each beginning with `indent` and without trailing
  // blanks.
  void print(std::ostream& out, std::string_view indent) const;

 private:
  struct Row {
    std::vector<std::string> cells;
    std::string before;
    std::string after;
  };

  Table inAscii() const;
  void printCells(std::ostream& out, std::string_view indent) const;
  std::vector<std::size_t> naturalWidths() const;
  // The widths of columns that take `room` in total; empty if they cannot.
  std::vector<std::size_t> widthsWithin(std::size_t room) const;
  void printAligned(std::ostream& out, std::string_view indent, const std::vector<std::size_t>& widths) const;
  void printBlocks(std::ostream& out, std::string_view indent) const;

  std::vector<Align> columns_;
  std::vector<Row> rows_;
  bool hasHeader_ = false;  // the first row
};

}  // namespace quazor
