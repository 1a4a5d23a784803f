#include "host/text/table.h"

#include "base/text/control_characters.h"
#include "base/text/hexadecimal.h"
#include "base/text/utf8.h"
#include "host/text/display_width.h"
#include "host/text/terminal.h"

#include <algorithm>
#include <numeric>
#include <utility>

namespace quazor {

namespace {

constexpr std::size_t kGap = 2;               // between two columns
constexpr std::string_view kNothing = "-";    // a cell without a value
constexpr std::size_t kMinFoldedColumn = 16;  // a narrower one is hard to read

// True for the characters that change the direction of the text around them, which can make a name look like another:
// U+061C, U+200E, U+200F, U+202A to U+202E, U+2066 to U+2069.
bool changesDirection(std::string_view character) {
  if (character == "\xD8\x9C") return true;
  if (character.size() != 3 || character[0] != '\xE2') return false;
  const unsigned second = static_cast<unsigned char>(character[1]);
  const unsigned third = static_cast<unsigned char>(character[2]);
  if (second == 0x80) return third == 0x8E || third == 0x8F || (third >= 0xAA && third <= 0xAE);
  return second == 0x81 && third >= 0xA6 && third <= 0xA9;
}

void appendEscaped(std::string& shown, std::string_view bytes) {
  for (; !bytes.empty(); bytes.remove_prefix(1)) shown += "\\x" + hexadecimal(bytes.substr(0, 1));
}

// Escapes control characters, marks of direction and invalid UTF-8 as \xNN, except the characters in `allowed`.
std::string shownText(std::string_view text, std::string_view allowed) {
  std::string shown;
  shown.reserve(text.size());
  while (!text.empty()) {
    const Utf8Sequence sequence = firstUtf8Sequence(text);
    const std::string_view character = text.substr(0, sequence.length);
    text.remove_prefix(sequence.length);
    if (isControlCharacter(character) && allowed.find(character.front()) == std::string_view::npos) {
      appendEscaped(shown, character.substr(character.size() - 1));  // the last byte equals the code point
    } else if (!sequence.wellFormed || changesDirection(character)) {
      appendEscaped(shown, character);
    } else {
      shown += character;
    }
  }
  return shown;
}

// Removes the first word, which ends at a blank outside back quotes, and the following blanks, and returns the word.
std::string_view takeWord(std::string_view& text) {
  bool quoted = false;
  std::size_t end = 0;
  for (; end < text.size() && (quoted || text[end] != ' '); ++end) quoted ^= text[end] == '`';
  const std::string_view word = text.substr(0, end);
  text.remove_prefix(std::min(text.find_first_not_of(' ', end), text.size()));
  return word;
}

// The words of a cell are separated by blanks.
std::size_t widestWordOf(std::string_view cell) {
  std::size_t widest = 0;
  while (!cell.empty()) {
    const std::size_t end = std::min(cell.find(' '), cell.size());
    widest = std::max(widest, widthOf(cell.substr(0, end)));
    cell.remove_prefix(std::min(end + 1, cell.size()));
  }
  return widest;
}

// The cell in lines of at most `width` columns.
std::vector<std::string> linesOf(const std::string& cell, std::size_t width) {
  if (widthOf(cell) <= width) return {cell};
  std::vector<std::string> lines;
  std::string line;
  for (std::string_view left = cell; !left.empty();) {
    const std::string_view word = left.substr(0, std::min(left.find(' '), left.size()));
    left.remove_prefix(std::min(word.size() + 1, left.size()));
    if (!line.empty() && widthOf(line) + 1 + widthOf(word) > width) lines.push_back(std::exchange(line, {}));
    if (!line.empty()) line += ' ';
    line += word;
  }
  lines.push_back(std::move(line));
  return lines;
}

}  // namespace

std::string printable(std::string_view text) { return shownText(text, ""); }

std::string printableLines(std::string_view text) { return shownText(text, "\t\n"); }

std::string indentedLines(std::string_view text, std::string_view indent) {
  std::string lines;
  while (true) {
    const std::size_t end = text.find('\n');
    lines += indent;
    lines += printable(text.substr(0, end));
    lines += '\n';
    if (end == std::string_view::npos) return lines;
    text.remove_prefix(end + 1);
  }
}

std::string countText(std::size_t number, std::string_view what) {
  return std::to_string(number) + ' ' + std::string(what) + (number == 1 ? "" : "s");
}

std::string wrapped(std::string_view text, std::string_view first, std::string_view rest, std::size_t columns) {
  const std::string shown = printable(text);
  std::string lines;
  std::string line(first);
  bool empty = true;  // `line` contains only its prefix
  for (std::string_view left = shown; !left.empty();) {
    const std::string_view word = takeWord(left);
    if (!empty && widthOf(line) + 1 + widthOf(word) > columns) {
      lines += line + '\n';
      line = rest;
      empty = true;
    }
    if (!empty) line += ' ';
    line += word;
    empty = false;
  }
  return lines + line + '\n';
}

void printWrapped(std::ostream& out, std::string_view text, std::string_view first, std::string_view rest) {
  const std::size_t columns = std::min(kWidestText, columnsOf(out));
  out << (showsOnlyAscii(out) ? wrapped(asciiText(text), first, rest, columns) : wrapped(text, first, rest, columns));
}

void Table::addHeader(std::vector<std::string> cells) {
  hasHeader_ = true;
  rows_.insert(rows_.begin(), {std::move(cells), {}, {}});
}

void Table::addRow(std::vector<std::string> cells, std::string before, std::string after) {
  rows_.push_back({std::move(cells), std::move(before), std::move(after)});
}

Table Table::inAscii() const {
  Table table = *this;
  for (Row& row : table.rows_) {
    for (std::string& cell : row.cells) cell = asciiText(cell);
  }
  return table;
}

void Table::print(std::ostream& out, std::string_view indent) const {
  showsOnlyAscii(out) ? inAscii().printCells(out, indent) : printCells(out, indent);
}

void Table::printCells(std::ostream& out, std::string_view indent) const {
  const std::size_t columns = columnsOf(out);
  const std::size_t lost = indent.size() + kGap * (columns_.size() - 1);
  const std::vector<std::size_t> widths = widthsWithin(columns > lost ? columns - lost : 0);
  widths.empty() ? printBlocks(out, indent) : printAligned(out, indent, widths);
}

std::vector<std::size_t> Table::naturalWidths() const {
  std::vector<std::size_t> widths(columns_.size());
  for (const Row& row : rows_) {
    for (std::size_t i = 0; i < columns_.size(); ++i) widths[i] = std::max(widths[i], widthOf(row.cells[i]));
  }
  return widths;
}

std::vector<std::size_t> Table::widthsWithin(std::size_t room) const {
  std::vector<std::size_t> widths = naturalWidths();
  std::size_t total = std::accumulate(widths.begin(), widths.end(), std::size_t{0});
  if (total <= room) return widths;
  std::vector<std::size_t> least = widths;
  for (std::size_t i = 0; i < columns_.size(); ++i) {
    if (columns_[i] == Align::kRight) continue;
    std::size_t word = 0;
    for (const Row& row : rows_) word = std::max(word, widestWordOf(row.cells[i]));
    least[i] = std::min(widths[i], std::max(word, kMinFoldedColumn));
  }
  if (std::accumulate(least.begin(), least.end(), std::size_t{0}) > room) return {};
  while (total > room) {  // the column that can give most gives first
    std::size_t giver = 0;
    for (std::size_t i = 1; i < widths.size(); ++i) {
      if (widths[i] - least[i] > widths[giver] - least[giver]) giver = i;
    }
    --widths[giver];
    --total;
  }
  return widths;
}

void Table::printAligned(std::ostream& out, std::string_view indent, const std::vector<std::size_t>& widths) const {
  for (const Row& row : rows_) {
    std::vector<std::vector<std::string>> cells;  // each in its lines
    std::size_t height = 1;
    for (std::size_t i = 0; i < columns_.size(); ++i) {
      cells.push_back(linesOf(row.cells[i], widths[i]));
      height = std::max(height, cells.back().size());
    }
    for (std::size_t at = 0; at < height; ++at) {
      std::string line(indent);
      for (std::size_t i = 0; i < columns_.size(); ++i) {
        const bool last = i + 1 == columns_.size();
        const std::string cell = at < cells[i].size() ? cells[i][at] : std::string();
        const std::string padding(widths[i] - widthOf(cell), ' ');
        if (columns_[i] == Align::kRight && !cell.empty()) line += padding;
        line += last && !cell.empty() ? row.before + cell + row.after : cell;
        if (!last && (columns_[i] == Align::kLeft || cell.empty())) line += padding;
        if (!last) line += std::string(kGap, ' ');
      }
      if (height > 1) line.erase(line.find_last_not_of(' ') + 1);
      out << line << '\n';
    }
  }
}

void Table::printBlocks(std::ostream& out, std::string_view indent) const {
  const std::vector<std::string> noNames(columns_.size());
  const std::vector<std::string>& names = hasHeader_ ? rows_.front().cells : noNames;
  std::size_t width = 0;
  for (std::size_t i = 1; i < names.size(); ++i) width = std::max(width, widthOf(names[i]));
  const std::string below = std::string(indent) + "  ";
  for (std::size_t at = hasHeader_ ? 1 : 0; at < rows_.size(); ++at) {
    const Row& row = rows_[at];
    out << indent << row.cells.front() << '\n';
    for (std::size_t i = 1; i < columns_.size(); ++i) {
      if (row.cells[i].empty() || row.cells[i] == kNothing) continue;
      const std::string name = hasHeader_ ? names[i] + std::string(width - widthOf(names[i]) + kGap, ' ') : "";
      const bool last = i + 1 == columns_.size();
      out << below << name << (last ? row.before + row.cells[i] + row.after : row.cells[i]) << '\n';
    }
  }
}

}  // namespace quazor
