#include "host/table.h"

#include <algorithm>
#include <utility>

namespace quazor {

namespace {

constexpr std::size_t kWidestLine = 80;

std::size_t widthOf(std::string_view text) {
  return static_cast<std::size_t>(std::count_if(
      text.begin(), text.end(), [](char unit) { return (static_cast<unsigned char>(unit) & 0xC0) != 0x80; }));
}

bool isControl(unsigned char unit) { return unit < 0x20 || unit == 0x7F; }

// The control characters U+0080 to U+009F, two bytes in UTF-8: terminals obey them too.
bool isWideControl(std::string_view rest) {
  return rest.size() >= 2 && rest[0] == '\xC2' && static_cast<unsigned char>(rest[1]) < 0xA0 &&
         static_cast<unsigned char>(rest[1]) >= 0x80;
}

// Up to the next blank outside of back quotes; takes it, and the blanks after it, off the text.
std::string_view takeWord(std::string_view& text) {
  bool quoted = false;
  std::size_t end = 0;
  for (; end < text.size() && (quoted || text[end] != ' '); ++end) quoted ^= text[end] == '`';
  const std::string_view word = text.substr(0, end);
  text.remove_prefix(std::min(text.find_first_not_of(' ', end), text.size()));
  return word;
}

}  // namespace

std::string printable(std::string_view text) {
  constexpr std::string_view kDigits = "0123456789abcdef";
  std::string shown;
  const auto escape = [&shown, kDigits](unsigned char unit) {
    shown += "\\x";
    shown += kDigits[unit >> 4U];
    shown += kDigits[unit & 0xFU];
  };
  for (std::size_t at = 0; at < text.size(); ++at) {
    const auto unit = static_cast<unsigned char>(text[at]);
    if (isWideControl(text.substr(at))) {
      escape(static_cast<unsigned char>(text[++at]));
    } else if (isControl(unit)) {
      escape(unit);
    } else {
      shown += text[at];
    }
  }
  return shown;
}

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

std::string wrapped(std::string_view text, std::string_view first, std::string_view rest) {
  const std::string shown = printable(text);
  std::string lines;
  std::string line(first);
  bool empty = true;  // but for its beginning
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
