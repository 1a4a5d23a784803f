// The progress line: what is running, for how long, and how many frames have come.
#pragma once

#include "frame/log_channel.h"
#include "host/parameters.h"

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <ostream>
#include <string>
#include <thread>

namespace quazor {

// What a run is expected to come to; nothing where its parameters do not say.
struct ExpectedProgress {
  std::optional<double> seconds;        // the experiment's parameter "duration", else its "timeout", if above zero
  std::optional<std::uint64_t> frames;  // the experiment's parameter "frameCount", if 1 or more
};

ExpectedProgress expectedProgressOf(const BoundParameters& parameters);

// "Running NAME: 1.2 s of 3 s, 36 of 90 frames", without what is not expected or not known.
std::string progressText(const std::string& name, double elapsedSeconds, const ExpectedProgress& expected,
                         std::optional<std::uint64_t> frames);

// Keeps one line of a terminal up to date while something runs, from 0.3 seconds after its beginning on, and erases it
// at the end. Any thread.
class Progress {
 public:
  // `terminal` is borrowed; null shows nothing.
  explicit Progress(std::ostream* terminal) : terminal_(terminal) {}
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;
  ~Progress() { stop(); }

  // REQUIRES: nothing is running.
  void start(const std::string& name, const ExpectedProgress& expected);
  // Asks `count` for the frames that have come, on a thread of its own, until stop(); it must not use this object.
  void countFrames(std::function<std::uint64_t()> count);
  // When it returns, the line is erased and stays so. Does nothing when nothing is running.
  void stop();
  // Erases the line and calls `write`, which may write to the terminal; the line comes back with its next change.
  void aside(const std::function<void()>& write);

 private:
  void show(const std::string& name, const ExpectedProgress& expected);
  void erase();

  std::ostream* const terminal_;
  std::mutex mutex_;  // held while the terminal is written to
  std::condition_variable wake_;
  bool running_ = false;                   // guarded by mutex_
  bool shown_ = false;                     // guarded by mutex_
  std::function<std::uint64_t()> frames_;  // guarded by mutex_
  std::thread thread_;                     // touched by start() and stop() only
};

// Hands log lines on with the progress line out of their way.
class LogBesideProgress final : public LogBackend {
 public:
  // `progress` is borrowed.
  LogBesideProgress(Progress& progress, std::shared_ptr<LogBackend> backend)
      : progress_(progress), backend_(std::move(backend)) {}

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

 private:
  Progress& progress_;
  const std::shared_ptr<LogBackend> backend_;
};

}  // namespace quazor
