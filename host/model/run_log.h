// RunLog: the log lines of one run.
#pragma once

#include "contract/log_channel.h"
#include "contract/value.h"
#include "platform/clock.h"

#include <chrono>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

class RunEventSink;

std::string_view nameOf(LogLevel level);  // "error", "default", "debug"

struct LogLine {
  std::chrono::nanoseconds time{};  // since the start of the run, by the phone's clock
  LogLevel level = LogLevel::kDefault;
  std::string text;
  Date date{};  // by the wall clock
};

// Sends every log line as an event until it is closed, except those of other runs' tasks.
// Thread: any.
class RunLog final : public LogBackend {
 public:
  // Starts the run's time. `events` is borrowed until close() and receives one line at a time.
  RunLog(std::shared_ptr<const Clock> clock, RunEventSink& events);

  void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) override;

  // When the run's time began, by its clock.
  std::chrono::nanoseconds begin() const { return begin_; }

  // Lines written after this are dropped.
  void close();

  // While it lives, only `log` takes the lines of the calling thread: a task that is late for its own run does not
  // write into the log of the next.
  // Thread: the one that made it.
  class Owner {
   public:
    explicit Owner(const RunLog& log) : before_(std::exchange(ownerOfThisThread, &log)) {}
    Owner(const Owner&) = delete;
    Owner& operator=(const Owner&) = delete;
    ~Owner() { ownerOfThisThread = before_; }

   private:
    const RunLog* const before_;
  };

 private:
  static thread_local const RunLog* ownerOfThisThread;  // null: any log takes the thread's lines

  const std::shared_ptr<const Clock> clock_;
  const std::chrono::nanoseconds begin_;
  std::mutex mutex_;      // held while the sink takes a line
  RunEventSink* events_;  // guarded by mutex_; null when closed
};

}  // namespace quazor
