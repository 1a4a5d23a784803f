// LogChannel: the one channel through which plug-ins write their log lines.
//
//   logError("Failed to set the multicam config! %@", underlying);
//
// A line whose level is disabled costs a load and a branch: its arguments are taken by reference and nothing is
// formatted, copied or allocated. So pass values and errors as they are, never their texts.
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

// Where log lines go: a platform service.
// Thread: any.
class QUAZOR_EXPORT LogBackend {
 public:
  LogBackend() = default;
  LogBackend(const LogBackend&) = delete;
  LogBackend& operator=(const LogBackend&) = delete;
  virtual ~LogBackend();

  // Takes one finished line; the texts are borrowed for the call.
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

  // Hands a finished line to the back-end, whatever its level; without a back-end it is dropped.
  void write(LogLevel level, std::string_view text);

  // From now on lines of `level` and of the levels before it go to `backend`. Null drops and disables all lines, as
  // it is before the first call. A line that is being written on another thread may still go to the back-end before.
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

// The process-wide channel, made on first use and never released. Any thread.
QUAZOR_EXPORT LogChannel& sharedLog();

// Out of line, so that a disabled line is no more than its test.
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
