// The limit on the log lines of one diagnostic.
#pragma once

#include "host/model/run_event.h"
#include "host/system/shared_counter.h"

#include <chrono>
#include <cstddef>
#include <cstdint>

namespace quazor {

// How much of a diagnostic's log is kept.
struct LogLimit {
  std::uint64_t lines = 1'000'000;
  std::uint64_t bytes = std::uint64_t{64} * 1024 * 1024;  // of text

  static constexpr LogLimit none() { return {UINT64_MAX, UINT64_MAX}; }
};

// Decides which log lines of a diagnostic are kept. After the first line that is not, none are: what is kept is the
// beginning of the log, without gaps.
// Thread: one at a time.
class LogCap {
 public:
  explicit LogCap(LogLimit limit) : limit_(limit) {}

  // Counts a line with `bytes` of text. Returns false if it must be left out.
  bool admits(std::size_t bytes);
  std::uint64_t leftOut() const { return leftOut_; }

 private:
  LogLimit limit_;  // what is left of it
  std::uint64_t leftOut_ = 0;
};

// Passes on the events of a diagnostic, but only as many log lines as the limit permits.
// Thread: one at a time.
class LimitedLog final : public RunEventSink {
 public:
  // `leftOut` counts the lines that are left out. Both references are borrowed.
  LimitedLog(RunEventSink& events, LogLimit limit, SharedCounter& leftOut)
      : events_(events), cap_(limit), leftOut_(leftOut) {}

  void onEvent(const RunEvent& event) override;

  // The time of the last line, also if it was left out.
  std::chrono::nanoseconds lastLine() const { return lastLine_; }

 private:
  RunEventSink& events_;
  LogCap cap_;
  SharedCounter& leftOut_;
  std::chrono::nanoseconds lastLine_{};
};

// The host's log line about `count` lines that were left out. `time` is that of the last line of the log.
Logged leftOutLine(std::uint64_t count, std::chrono::nanoseconds time);

}  // namespace quazor
