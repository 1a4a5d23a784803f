// LogChannel: the one channel through which plug-ins write their log lines.
//
//   logError("Failed to set the multicam config! %@", underlying);
//
// A line whose level is disabled costs a load and a branch: arguments are passed by reference, and nothing is
// formatted, copied or allocated. Pass values and errors directly instead of converting them to text.
#pragma once

#include "contract/contract.h"
#include "contract/message_format.h"

#include <atomic>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>

namespace QUAZOR_CONTRACT {

enum class LogLevel : int { kError = 1, kDefault = 2, kDebug = 3 };

// The destination of log lines; a platform service.
// Thread: any.
class QUAZOR_EXPORT LogBackend {
 public:
  LogBackend() = default;
  LogBackend(const LogBackend&) = delete;
  LogBackend& operator=(const LogBackend&) = delete;
  virtual ~LogBackend();

  // Writes one formatted line. The texts are valid only during the call.
  //
  // Thread: any, several at once. Must not throw, must not write to the log, and must not take a lock that a caller
  //   of the log may hold. A line that cannot be written is dropped.
  virtual void write(LogLevel level, std::string_view subsystem, std::string_view category, std::string_view text) = 0;
};

// There is one in a process: sharedLog().
// Thread: any.
class QUAZOR_EXPORT LogChannel {
 public:
  LogChannel(const LogChannel&) = delete;
  LogChannel& operator=(const LogChannel&) = delete;

  const std::string& subsystem() const { return subsystem_; }
  const std::string& category() const { return category_; }

  // Passes a formatted line to the back end regardless of its level. Without a back end, the line is dropped.
  void write(LogLevel level, std::string_view text);

  // Sends lines of `level` and more severe levels to `backend` from now on. A null backend disables all lines, which
  // is also the initial state. A line that another thread is writing may still go to the previous back end.
  void setBackend(std::shared_ptr<LogBackend> backend, LogLevel level);

  static bool isEnabled(LogLevel level) {
    return threshold_.load(std::memory_order_relaxed) >= static_cast<int>(level);
  }

 private:
  friend QUAZOR_EXPORT LogChannel& sharedLog();
  LogChannel(std::string subsystem, std::string category);

  static std::atomic<int> threshold_;  // the last enabled level; 0 for none

  std::string subsystem_;
  std::string category_;
  std::mutex mutex_;
  std::shared_ptr<LogBackend> backend_;  // guarded by mutex_
};

// The process-wide channel, created on first use and never destroyed. Any thread.
QUAZOR_EXPORT LogChannel& sharedLog();

// Out of line, so that the code of a disabled line is only the level check.
template <class... Arguments>
[[gnu::noinline, gnu::cold]] void writeLogLine(LogLevel level, MessageFormat<Arguments...> format,
                                               const Arguments&... arguments) {
  sharedLog().write(level, formatMessage<Arguments...>(format, arguments...));
}

template <class... Arguments>
void logError(MessageFormat<Arguments...> format, const Arguments&... arguments) {
  if (LogChannel::isEnabled(LogLevel::kError)) [[unlikely]] {
    writeLogLine<Arguments...>(LogLevel::kError, format, arguments...);
  }
}

template <class... Arguments>
void logDefault(MessageFormat<Arguments...> format, const Arguments&... arguments) {
  if (LogChannel::isEnabled(LogLevel::kDefault)) [[unlikely]] {
    writeLogLine<Arguments...>(LogLevel::kDefault, format, arguments...);
  }
}

template <class... Arguments>
void logDebug(MessageFormat<Arguments...> format, const Arguments&... arguments) {
  if (LogChannel::isEnabled(LogLevel::kDebug)) [[unlikely]] {
    writeLogLine<Arguments...>(LogLevel::kDebug, format, arguments...);
  }
}

}  // namespace QUAZOR_CONTRACT
