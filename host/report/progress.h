// The progress line: what is running, for how long, and how many frames have come.
#pragma once

#include "host/plugin/parameters.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <ostream>
#include <string>

namespace quazor {

// What a run is expected to come to; nothing where its parameters do not say.
struct ExpectedProgress {
  std::optional<double> seconds;        // the experiment's parameter "duration", else its "timeout", if above zero
  std::optional<std::uint64_t> frames;  // the experiment's parameter "frameCount", if 1 or more
};

ExpectedProgress expectedProgressOf(const ResolvedParameters& parameters);

// "Running NAME: 1.2 s of 3 s, 36 of 90 frames", without what is not expected or not known.
std::string progressText(const std::string& name, double elapsedSeconds, const ExpectedProgress& expected,
                         std::optional<std::uint64_t> frames);

// One line of a terminal about what is running, from 0.3 seconds after its beginning on; erased at the end.
//
// Thread: one at a time.
class Progress {
 public:
  // `terminal` is borrowed; null shows nothing.
  explicit Progress(std::ostream* terminal) : terminal_(terminal) {}
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  ~Progress() { stop(); }

  bool isShown() const { return terminal_ != nullptr; }
  // REQUIRES: nothing is running.
  void start(const std::string& name, const ExpectedProgress& expected);
  // Where the number of frames that have come is asked for, until stop(). Does nothing when nothing is running.
  void countFrames(std::function<std::uint64_t()> count);
  // Brings the line up to date; to be called now and then, as often as one likes.
  void update();
  // Erases the line. Does nothing when nothing is running.
  void stop();
  // Erases the line and calls `write`, which may write to the terminal; the line comes back with its next change.
  void aside(const std::function<void()>& write);

 private:
  void erase();

  std::ostream* const terminal_;
  bool running_ = false;
  bool lineIsThere_ = false;
  std::string name_;
  ExpectedProgress expected_;
  std::function<std::uint64_t()> frames_;
  std::chrono::steady_clock::time_point begin_;
  std::chrono::steady_clock::time_point nextUpdate_;
};

}  // namespace quazor
