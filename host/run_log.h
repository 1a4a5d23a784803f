// RunLog: the log lines of one run.
#pragma once

#include "frame/log_channel.h"
#include "platform/clock.h"

#include <chrono>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

std::string_view nameOf(LogLevel level);  // "error", "default", "debug"

struct LogLine {
  std::chrono::nanoseconds time{};  // since the run began, by the phone's clock
  LogLevel level = LogLevel::kDefault;
  std::string text;
};

// Keeps every line with its time, and hands those of the chosen levels on. Any thread.
class RunLog final : public LogBackend {
 public:
  // Gets the lines of `level` and of the levels before it.
  struct Listener {
    std::shared_ptr<LogBackend> backend;
    LogLevel level;
  };

  // The run begins now.
  RunLog(std::shared_ptr<const Clock> clock, std::vector<Listener> listeners);

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

  std::vector<LogLine> lines() const;

 private:
  const std::shared_ptr<const Clock> clock_;
  const std::chrono::nanoseconds begin_;
  const std::vector<Listener> listeners_;
  mutable std::mutex mutex_;    // nothing else is called while it is held
  std::vector<LogLine> lines_;  // guarded by mutex_
};

}  // namespace quazor
