// StandardErrorLog: log lines for people, on the standard error stream.
#pragma once

#include "contract/log_channel.h"
#include "platform/clock.h"

#include <memory>
#include <mutex>
#include <string>
#include <string_view>

namespace quazor {

// One line of the log as people read it, with the closing newline:
//
//   2026-11-21 01:08:00.250 error quazor: Failed to get the capture plug-in!
//
// The time is UTC, to the millisecond. The further lines of a text are indented by four spaces, so that each record
// still begins at the margin.
std::string readableLogLine(Date date, LogLevel level, std::string_view category, std::string_view text);

// Hands each line to the stream with one call, so that lines of several threads never mix.
// Thread: any.
class StandardErrorLog final : public LogBackend {
 public:
  // `clock` dates the lines. `descriptor` is borrowed and stays open: a test gives its own.
  explicit StandardErrorLog(std::shared_ptr<const Clock> clock, int descriptor = 2);

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

 private:
  const std::shared_ptr<const Clock> clock_;
  const int descriptor_;
  // Held while a line is written: what a pipe cannot take in one piece comes in several. Nothing else is called then.
  std::mutex mutex_;
};

}  // namespace quazor
