// The progress line: the running diagnostic, the elapsed time and the number of frames.
#pragma once

#include "host/plugin/parameters.h"
#include "host/text/terminal.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <ostream>
#include <string>

namespace quazor {

// The expected duration and number of frames of a run; nothing if its parameters do not determine them.
struct ExpectedProgress {
  std::optional<double> seconds;        // the experiment's parameter "duration", else its "timeout", if above zero
  std::optional<std::uint64_t> frames;  // the experiment's parameter "frameCount", if 1 or more
};

ExpectedProgress expectedProgressOf(const ResolvedParameters& parameters);

// "Running NAME: 1.2 s of 3 s, 36 of 90 frames", without the parts that are unknown. The name is shortened if the text
// takes more than `columns` columns.
std::string progressText(const std::string& name, double elapsedSeconds, const ExpectedProgress& expected,
                         std::optional<std::uint64_t> frames, std::size_t columns = kUnlimitedColumns);

// A line on a terminal that the next one replaces. It is never so long that the terminal would wrap it.
//
// Thread: one at a time.
class StatusLine {
 public:
  // `terminal` is borrowed; null shows nothing.
  explicit StatusLine(std::ostream* terminal) : terminal_(terminal) {}
  StatusLine(const StatusLine&) = delete;
  StatusLine& operator=(const StatusLine&) = delete;
  ~StatusLine() { erase(); }

  bool isShown() const { return terminal_ != nullptr; }
  // The number of columns for a text.
  std::size_t columns() const;
  // The text is shortened if it is too long.
  void show(const std::string& text);
  void erase();

 private:
  std::ostream* const terminal_;
  bool isThere_ = false;
};

// Shows the progress in one terminal line, starting 0.3 seconds after the start of a run and erased at its end.
//
// Thread: one at a time.
class Progress {
 public:
  // `terminal` is borrowed; null shows nothing.
  explicit Progress(std::ostream* terminal) : line_(terminal) {}
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  ~Progress() { stop(); }

  bool isShown() const { return line_.isShown(); }
  // REQUIRES: nothing is running.
  void start(const std::string& name, const ExpectedProgress& expected);
  // Sets the function that returns the number of frames, until stop(). Does nothing if nothing is running.
  void countFrames(std::function<std::uint64_t()> count);
  // Updates the line. Call it periodically, at any interval.
  void update();
  // Erases the line. Does nothing if nothing is running.
  void stop();
  // Erases the line and calls `write`, which may write to the terminal. The next update shows the line again.
  void printAbove(const std::function<void()>& write);

 private:
  StatusLine line_;
  bool running_ = false;
  std::string name_;
  ExpectedProgress expected_;
  std::function<std::uint64_t()> frames_;
  std::chrono::steady_clock::time_point begin_;
  std::chrono::steady_clock::time_point nextUpdate_;
};

}  // namespace quazor
