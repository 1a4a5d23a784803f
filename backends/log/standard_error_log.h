// StandardErrorLog: user-readable log lines on standard error.
#pragma once

#include "contract/log_channel.h"
#include "platform/clock.h"

#include <memory>
#include <mutex>
#include <string>
#include <string_view>

namespace quazor {

// Formats a log line for users, including the newline:
//
//   2026-11-21 01:08:00.250 error quazor: Failed to get the capture plug-in!
//
// The time is UTC with millisecond precision. Continuation lines of a text are indented by four spaces, so that each
// record begins at the margin.
std::string readableLogLine(Date date, LogLevel level, std::string_view category, std::string_view text);

// Writes each line with one call, so that lines of several threads are not mixed.
// Thread: any.
class StandardErrorLog final : public LogBackend {
 public:
  // `clock` provides the dates. `descriptor` is borrowed and must stay open; tests pass their own.
  explicit StandardErrorLog(std::shared_ptr<const Clock> clock, int descriptor = 2);

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

 private:
  const std::shared_ptr<const Clock> clock_;
  const int descriptor_;
  // Held during a write, because a pipe may take a long line in several pieces. Nothing else is called while it is
  // held.
  std::mutex mutex_;
};

}  // namespace quazor
