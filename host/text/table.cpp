#include "host/text/table.h"

#include "base/text/hexadecimal.h"
#include "base/text/utf8.h"

#include <algorithm>
#include <utility>

namespace quazor {

namespace {

constexpr std::size_t kWidestLine = 80;

bool isControl(unsigned char unit) { return unit < 0x20 || unit == 0x7F; }

// True for the control characters U+0080 to U+009F, two bytes in UTF-8, which terminals also interpret.
bool isWideControl(std::string_view character) {
  return character.size() == 2 && character[0] == '\xC2' && static_cast<unsigned char>(character[1]) < 0xA0;
}

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
    if (isWideControl(character)) {
      appendEscaped(shown, character.substr(1));  // the second byte equals the code point
    } else if (!sequence.wellFormed || changesDirection(character) ||
               (isControl(static_cast<unsigned char>(character.front())) &&
                allowed.find(character.front()) == std::string_view::npos)) {
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

}  // namespace

std::size_t widthOf(std::string_view text) {
  return static_cast<std::size_t>(
      std::count_if(text.begin(), text.end(), [](char unit) { return !continuesUtf8(unit); }));
}

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

std::string wrapped(std::string_view text, std::string_view first, std::string_view rest) {
  const std::string shown = printable(text);
  std::string lines;
  std::string line(first);
  bool empty = true;  // `line` contains only its prefix
  for (std::string_view left = shown; !left.empty();) {
    const std::string_view word = takeWord(left);
    if (!empty && widthOf(line) + 1 + widthOf(word) > kWidestLine) {
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

void Table::addRow(std::vector<std::string> cells, std::string before, std::string after) {
  rows_.push_back({std::move(cells), std::move(before), std::move(after)});
}

void Table::print(std::ostream& out, std::string_view indent) const {
  std::vector<std::size_t> widths(columns_.size());
  for (const Row& row : rows_) {
    for (std::size_t i = 0; i < columns_.size(); ++i) widths[i] = std::max(widths[i], widthOf(row.cells[i]));
  }
  for (const Row& row : rows_) {
    std::string line(indent);
    for (std::size_t i = 0; i < columns_.size(); ++i) {
      const bool last = i + 1 == columns_.size();
      const std::string padding(widths[i] - widthOf(row.cells[i]), ' ');
      if (columns_[i] == Align::kRight) line += padding;
      line += last ? row.before + row.cells[i] + row.after : row.cells[i];
      if (columns_[i] == Align::kLeft && !last) line += padding;
      if (!last) line += "  ";
    }
    out << line << '\n';
  }
}

}  // namespace quazor
