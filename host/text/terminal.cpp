#include "host/text/terminal.h"

#include "base/text/hexadecimal.h"
#include "host/text/display_width.h"

#include <sys/ioctl.h>

#include <algorithm>
#include <utility>
#include <vector>

namespace quazor {

namespace {

constexpr std::size_t kUsualColumns = 80;  // of a terminal that does not say its size
constexpr std::size_t kMinRoom = 16;       // below the last column of a line, for the text that belongs there
constexpr std::size_t kHang = 2;           // of the later lines of a line without columns

// What the streams hold: 0 without a terminal, the number of columns, or -1 - the descriptor of the terminal.
int indexOfColumns() {
  static const int index = std::ios_base::xalloc();
  return index;
}

// 1 if the terminal shows only ASCII.
int indexOfAscii() {
  static const int index = std::ios_base::xalloc();
  return index;
}

std::size_t columnsOfTerminal(int descriptor) {
  winsize size{};
  const bool isKnown = ::ioctl(descriptor, TIOCGWINSZ, &size) == 0 && size.ws_col > 0;
  return isKnown ? size.ws_col : kUsualColumns;
}

// A part of a line between two gaps.
struct Segment {
  std::size_t gap;  // the number of blanks before it
  std::string_view text;
};

bool isGap(std::string_view text) { return text.starts_with("  "); }

std::vector<Segment> segmentsOf(std::string_view line) {
  std::vector<Segment> segments;
  while (!line.empty()) {
    const std::size_t begin = std::min(line.find_first_not_of(' '), line.size());
    std::size_t end = begin;
    while (end < line.size() && !isGap(line.substr(end))) ++end;
    if (end > begin) segments.push_back({begin, line.substr(begin, end - begin)});
    line.remove_prefix(end);
  }
  return segments;
}

// Where the later lines begin: below the last segment with room enough.
std::size_t hangOf(const std::vector<Segment>& segments, std::size_t columns) {
  const std::size_t room = std::max(kMinRoom, columns / 3);
  const std::size_t indent = segments.front().gap;
  std::size_t hang = indent + (segments.size() > 1 || indent == 0 ? kHang : 0);
  if (segments.size() > 1) hang += kHang;
  std::size_t at = 0;
  for (const Segment& one : segments) {
    at += one.gap;
    if (&one != &segments.front() && at + room <= columns) hang = at;
    at += widthOf(one.text);
  }
  return hang + kMinRoom <= columns ? hang : 0;
}

// Builds the lines of one that is too wide.
class Folder {
 public:
  Folder(std::size_t columns, std::size_t hang) : columns_(columns), hang_(hang) {}

  void add(const Segment& segment) {
    const std::size_t gap = isEmpty_ && width_ + segment.gap >= columns_ ? 0 : segment.gap;
    const bool fits = width_ + gap + widthOf(segment.text) <= columns_;
    // A segment at the place where later lines begin is broken where it is; others go to a line of their own.
    if (fits || isEmpty_ || width_ + gap == hang_) {
      put(std::string(gap, ' '));
    } else {
      begin();
    }
    addWords(segment.text);
  }

  std::string lines() && { return std::move(lines_) + std::move(line_); }

 private:
  void addWords(std::string_view text) {
    std::size_t blanks = 0;
    while (!text.empty()) {
      const std::size_t end = std::min(text.find(' '), text.size());
      addWord(text.substr(0, end), blanks);
      const std::size_t next = std::min(text.find_first_not_of(' ', end), text.size());
      blanks = next - end;
      text.remove_prefix(next);
    }
  }

  void addWord(std::string_view word, std::size_t blanks) {
    const std::size_t width = widthOf(word);
    if (width_ + blanks + width <= columns_) {
      put(std::string(blanks, ' '));
    } else if (!isEmpty_ || width_ > hang_) {
      begin();
    }
    while (widthOf(word) > columns_ - width_) {
      const std::string_view piece = pieceOf(word);
      put(piece);
      word.remove_prefix(piece.size());
      begin();
    }
    put(word);
    isEmpty_ = false;
  }

  // The beginning of a word that is too long, if possible up to a slash.
  std::string_view pieceOf(std::string_view word) const {
    const std::string_view piece = prefixOfWidth(word, columns_ - width_);
    if (piece.empty()) return firstGlyph(word).bytes;  // a terminal of one column
    const std::size_t slash = piece.rfind('/');
    return slash != std::string_view::npos && slash > piece.size() / 2 ? piece.substr(0, slash + 1) : piece;
  }

  void put(std::string_view text) {
    line_ += text;
    width_ += widthOf(text);
  }

  void begin() {
    while (line_.ends_with(' ')) line_.pop_back();
    lines_ += line_ + '\n';
    line_.assign(hang_, ' ');
    width_ = hang_;
    isEmpty_ = true;
  }

  const std::size_t columns_;
  const std::size_t hang_;
  std::string lines_;
  std::string line_;
  std::size_t width_ = 0;
  bool isEmpty_ = true;  // no word is in the line yet
};

std::string withoutTabs(std::string_view line) {
  constexpr std::size_t kStop = 8;
  std::string text;
  for (const char unit : line) {
    if (unit == '\t') {
      text.append(kStop - widthOf(text) % kStop, ' ');
    } else {
      text += unit;
    }
  }
  return text;
}

std::string_view substituteOf(std::string_view character) {
  constexpr std::pair<std::string_view, std::string_view> kSubstitutes[] = {
      {"\u00B0", "deg"}, {"\u00B1", "+-"},  {"\u00B5", "u"},  {"\u03BC", "u"},  {"\u00D7", "x"},
      {"\u2013", "-"},   {"\u2014", "-"},   {"\u2018", "'"},  {"\u2019", "'"},  {"\u201C", "\""},
      {"\u201D", "\""},  {"\u2026", "..."}, {"\u2264", "<="}, {"\u2265", ">="}, {"\u00A0", " "}};
  for (const auto& [symbol, substitute] : kSubstitutes) {
    if (symbol == character) return substitute;
  }
  return {};
}

}  // namespace

std::size_t columnsOf(std::ostream& out) {
  const long columns = out.iword(indexOfColumns());
  if (columns == 0) return kUnlimitedColumns;
  return columns > 0 ? static_cast<std::size_t>(columns) : columnsOfTerminal(static_cast<int>(-1 - columns));
}

void setColumns(std::ostream& out, std::size_t columns) { out.iword(indexOfColumns()) = static_cast<long>(columns); }

bool showsOnlyAscii(std::ostream& out) { return out.iword(indexOfAscii()) != 0; }

void prepareFor(const std::ostream& out, std::ostream& copy) { copy.copyfmt(out); }

std::string foldedLine(std::string_view line, std::size_t columns) {
  if (line.size() <= columns && line.find('\t') == std::string_view::npos) return std::string(line);
  const std::string text = withoutTabs(line);
  if (widthOf(text) <= columns) return std::string(line);
  const std::vector<Segment> segments = segmentsOf(text);
  if (segments.empty()) return {};
  Folder folder(columns, hangOf(segments, columns));
  for (const Segment& one : segments) folder.add(one);
  return std::move(folder).lines();
}

std::string asciiText(std::string_view text) {
  std::string ascii;
  while (!text.empty()) {
    const Glyph glyph = firstGlyph(text);
    text.remove_prefix(glyph.bytes.size());
    const std::string_view substitute = substituteOf(glyph.bytes);
    if (!substitute.empty()) {
      ascii += substitute;
      continue;
    }
    for (const char byte : glyph.bytes) {
      if (static_cast<unsigned char>(byte) < 0x80) {
        ascii += byte;
      } else {
        ascii += "\\x" + hexadecimal({&byte, 1});
      }
    }
  }
  return ascii;
}

TerminalBuffer::~TerminalBuffer() { passLine(false); }

bool TerminalBuffer::passUnchanged(std::string_view text) {
  const auto length = static_cast<std::streamsize>(text.size());
  return passLine(false) && target_->sputn(text.data(), length) == length;
}

TerminalBuffer::int_type TerminalBuffer::overflow(int_type character) {
  if (traits_type::eq_int_type(character, traits_type::eof())) return traits_type::not_eof(character);
  return add(traits_type::to_char_type(character)) ? character : traits_type::eof();
}

std::streamsize TerminalBuffer::xsputn(const char* text, std::streamsize length) {
  for (std::streamsize i = 0; i < length; ++i) {
    if (!add(text[i])) return i;
  }
  return length;
}

int TerminalBuffer::sync() {
  const bool isPassed = passLine(false);
  return target_->pubsync() == 0 && isPassed ? 0 : -1;
}

bool TerminalBuffer::add(char character) {
  if (character == '\n') return passLine(true);
  line_ += character;
  return true;
}

bool TerminalBuffer::passLine(bool isComplete) {
  std::string text = std::exchange(line_, std::string());
  if (!utf8_) text = asciiText(text);
  if (isComplete) text = foldedLine(text, columnsOf(owner_)) + '\n';
  const auto length = static_cast<std::streamsize>(text.size());
  return length == 0 || target_->sputn(text.data(), length) == length;
}

TerminalStream::TerminalStream(std::streambuf* target, int descriptor, bool utf8)
    : std::ostream(nullptr), buffer_(target, *this, utf8) {
  iword(indexOfColumns()) = -1L - descriptor;
  iword(indexOfAscii()) = utf8 ? 0 : 1;
  rdbuf(&buffer_);
}

void writeUnfolded(std::ostream& out, std::string_view text) {
  auto* const terminal = dynamic_cast<TerminalStream*>(&out);
  if (terminal == nullptr) {
    out << text;
  } else if (!terminal->buffer().passUnchanged(text)) {
    out.setstate(std::ios_base::badbit);
  }
}

}  // namespace quazor
