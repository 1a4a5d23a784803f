// The width of the terminal that a stream writes to, and a stream that makes no terminal wrap its lines.
#pragma once

#include <cstddef>
#include <limits>
#include <ostream>
#include <streambuf>
#include <string>
#include <string_view>

namespace quazor {

// The width of what is no terminal.
inline constexpr std::size_t kUnlimitedColumns = std::numeric_limits<std::size_t>::max();

// The number of columns for a line of the stream: those that its terminal has now, or kUnlimitedColumns.
std::size_t columnsOf(std::ostream& out);

// Gives lines of the stream this many columns.
void setColumns(std::ostream& out, std::size_t columns);

// True if the terminal of the stream shows only ASCII.
bool showsOnlyAscii(std::ostream& out);

// Makes `copy` the same as `out` in both respects: for text that `out` will receive.
void prepareFor(const std::ostream& out, std::ostream& copy);

// The line, without its line end, in lines of at most `columns` columns. They are broken between columns of the line
// (two blanks or more), else at blanks, and only a word that is wider than the terminal is broken inside. The later
// lines are indented below the last column of the line that has room enough. No character but blanks is dropped.
std::string foldedLine(std::string_view line, std::size_t columns);

// Text in ASCII, for terminals without UTF-8: some symbols have a substitute, other characters become \xNN.
std::string asciiText(std::string_view text);

// Folds complete lines; what is flushed before its line is complete is passed on as it is.
// Thread: one at a time.
class TerminalBuffer final : public std::streambuf {
 public:
  // `owner` tells the width. Both are borrowed.
  TerminalBuffer(std::streambuf* target, std::ostream& owner, bool utf8)
      : target_(target), owner_(owner), utf8_(utf8) {}
  TerminalBuffer(const TerminalBuffer&) = delete;
  TerminalBuffer& operator=(const TerminalBuffer&) = delete;
  ~TerminalBuffer() override;

  // Passes the text on unchanged, after what is there already.
  bool passUnchanged(std::string_view text);

 protected:
  int_type overflow(int_type character) override;
  std::streamsize xsputn(const char* text, std::streamsize length) override;
  int sync() override;

 private:
  bool add(char character);
  bool passLine(bool isComplete);

  std::streambuf* const target_;
  std::ostream& owner_;
  const bool utf8_;
  std::string line_;
};

// A stream to a terminal. Lines are folded to its width at the time when they are written.
// Thread: one at a time.
class TerminalStream final : public std::ostream {
 public:
  // Writes to `target`, which is borrowed; the terminal of the descriptor tells the width. `utf8`: it shows UTF-8.
  TerminalStream(std::streambuf* target, int descriptor, bool utf8);

  TerminalBuffer& buffer() { return buffer_; }

 private:
  TerminalBuffer buffer_;
};

// Writes text for programs (JSON, a script), whose lines must not be folded.
void writeUnfolded(std::ostream& out, std::string_view text);

}  // namespace quazor
